// The answer to one request, whatever front carries it.
#ifndef PROGRAMS_VISITOR_ANSWER_H_
#define PROGRAMS_VISITOR_ANSWER_H_

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/unique_fd.h"

namespace visitor {

// A piece of a link's open file.
struct FilePiece {
  common::UniqueFd fd;
  std::int64_t offset = 0;
  std::int64_t length = 0;
  int link = 0;  // the link's row
};

struct Answer {
  int status = 200;
  std::vector<std::pair<std::string, std::string>> headers;
  std::string body;               // sent when there is no file
  std::optional<FilePiece> file;  // sent in place of `body`
  bool carries_cookie = false;    // the visitor's cookie was queued, and belongs to the headers
};

// Adds a header. A value with a control character in it, which could end the header and begin
// another, throws std::invalid_argument: nothing that is made of a link's or a visitor's texts may
// come that far.
void AddHeader(Answer* answer, std::string_view name, std::string_view value);

// The answer's status line and headers as CGI has them, each line with its end, without the empty
// line that ends them: the answer's own headers, the length of what it sends (a 304 apart), and
// those that every answer has: never stored, never indexed, no referrer, no guessing of types.
std::string HeaderLines(const Answer& answer);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_ANSWER_H_
