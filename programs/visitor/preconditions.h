// Conditional requests: whether the visitor already has the file, or has another version of it.
#ifndef PROGRAMS_VISITOR_PRECONDITIONS_H_
#define PROGRAMS_VISITOR_PRECONDITIONS_H_

#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace visitor {

// The request's headers that set conditions; empty ones were not sent.
struct ConditionHeaders {
  std::string if_match;
  std::string if_unmodified_since;
  std::string if_none_match;
  std::string if_modified_since;
  std::string if_range;
};

// What tells one version of a file from another.
struct Validators {
  std::string etag;  // strong, with its quotes
  std::time_t modified = 0;
};

enum class Verdict { kSend, kNotModified, kFailed };

// Evaluates the conditions of a GET or HEAD in the order that HTTP sets, if_range aside.
Verdict Evaluate(const ConditionHeaders& headers, const Validators& validators);

// Whether a Range header may be honoured as far as If-Range goes: it is not there, or it names this
// very version. A date does so only when the file has not changed in the last two seconds, since
// within one second there may have been two versions.
bool RangeApplies(const std::string& if_range, const Validators& validators, std::time_t now);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_PRECONDITIONS_H_
