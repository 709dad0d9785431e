// TUVO.API.Info: what the API offers, and to whom.
#ifndef PROGRAMS_WEBAPI_INFO_API_H_
#define PROGRAMS_WEBAPI_INFO_API_H_

#include "webapi/registry.h"

namespace webapi {

Api InfoApi();

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_INFO_API_H_
