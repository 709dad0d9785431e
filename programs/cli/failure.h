// Why a command was not done.
#ifndef PROGRAMS_CLI_FAILURE_H_
#define PROGRAMS_CLI_FAILURE_H_

#include <stdexcept>
#include <string>

#include "cli/exit_status.h"
#include "owner/problem.h"

namespace cli {

// Ends the command: its text is shown in one line, its status is the program's.
class Failure : public std::runtime_error {
 public:
  Failure(ExitStatus status, const std::string& text) : std::runtime_error(text), status_(status) {}

  ExitStatus status() const { return status_; }

 private:
  ExitStatus status_;
};

// The problem in the words of the command line: its field as the option that sets it. `subject`,
// unless empty, is the link that it is about.
Failure FailureOf(const owner::Problem& problem, const std::string& subject = {});

// Failure with the reason that errno gives.
Failure SystemFailure(const std::string& what);

// Throws the problem, if there is one.
void Require(const owner::MaybeProblem& problem, const std::string& subject = {});

}  // namespace cli

#endif  // PROGRAMS_CLI_FAILURE_H_
