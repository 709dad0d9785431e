#include "cli/failure.h"

#include <cerrno>
#include <cstring>

#include "cli/setting_options.h"

namespace cli {

Failure FailureOf(const owner::Problem& problem, const std::string& subject) {
  std::string text = subject.empty() ? "" : subject + ": ";
  if (!problem.field.empty()) {
    text += OptionOf(problem.field) + ": ";
  }
  return {StatusOf(problem.error), text + problem.message, problem.error};
}

Failure SystemFailure(const std::string& what) {
  return {ExitStatus::kFailed, what + ": " + std::strerror(errno)};
}

void Require(const owner::MaybeProblem& problem, const std::string& subject) {
  if (problem) {
    throw FailureOf(*problem, subject);
  }
}

}  // namespace cli
