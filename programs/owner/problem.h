// Why an owner's request was not done.
#ifndef PROGRAMS_OWNER_PROBLEM_H_
#define PROGRAMS_OWNER_PROBLEM_H_

#include <optional>
#include <string>
#include <utility>

namespace owner {

// The numbers are part of the web API (docs/webapi.md).
enum class Error : int {
  kInternal = 100,
  kMalformedRequest = 101,
  kNoSuchApi = 102,
  kNoSuchMethod = 103,
  kNoSuchVersion = 104,
  kNoAccount = 105,
  kForbidden = 106,
  kNeedsPost = 107,
  kNeedsJson = 108,
  kOtherOrigin = 109,
  kTooLarge = 110,
  kUnknownArgument = 200,
  kMissingArgument = 201,
  kWrongType = 202,
  kBadValue = 203,
  kHashTaken = 204,
  kNoSuchLink = 205,
  kFileNotAllowed = 206,
  kBusy = 207,
  kConflict = 208,
};

// `field` names the argument at fault and is empty when it is none. The message is for the person
// who asked, fits behind "<field>: ", and never repeats a value.
struct Problem {
  Error error = Error::kInternal;
  std::string message;
  std::string field;
};

// No value: all went well.
using MaybeProblem = std::optional<Problem>;

inline MaybeProblem Fault(Error error, std::string message, std::string field = {}) {
  return Problem{error, std::move(message), std::move(field)};
}

// What is said when the system log holds the reason.
inline MaybeProblem InternalFault() {
  return Problem{Error::kInternal, "failed; the system log says why", {}};
}

}  // namespace owner

#endif  // PROGRAMS_OWNER_PROBLEM_H_
