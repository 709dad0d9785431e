// A file as the answer to a request.
#ifndef PROGRAMS_VISITOR_FILE_ANSWER_H_
#define PROGRAMS_VISITOR_FILE_ANSWER_H_

#include <ctime>

#include "visitor/answer.h"
#include "visitor/request.h"
#include "visitor/shared_file.h"

namespace visitor {

// The file as a download: whole, or the one part that the request asks for; or the answer that the
// request's conditions call for. Takes the file over.
Answer FileAnswer(const Request& request, SharedFile file, std::time_t now);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_FILE_ANSWER_H_
