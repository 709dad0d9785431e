#include "webapi/registry.h"

#include <algorithm>

#include "webapi/info_api.h"
#include "webapi/link_api.h"

namespace webapi {

namespace {

using owner::Error;
using owner::Fault;

template <typename Named>
const Named* Find(const std::vector<Named>& all, const std::string& name) {
  const auto found =
      std::find_if(all.begin(), all.end(), [&name](const Named& one) { return name == one.name; });
  return found == all.end() ? nullptr : &*found;
}

}  // namespace

const std::vector<Api>& Apis() {
  static const std::vector<Api> apis = {LinkApi(), InfoApi()};
  return apis;
}

owner::MaybeProblem FindMethod(const Call& call, const Method** method) {
  const Api* api = Find(Apis(), call.api);
  if (api == nullptr) {
    return Fault(Error::kNoSuchApi, "there is no such API");
  }
  if (call.version < api->min_version || call.version > api->max_version) {
    return Fault(Error::kNoSuchVersion, "there is no such version of this API");
  }
  *method = Find(api->methods, call.method);
  return *method == nullptr ? Fault(Error::kNoSuchMethod, "there is no such method of this API")
                            : std::nullopt;
}

}  // namespace webapi
