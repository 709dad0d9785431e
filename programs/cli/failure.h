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
  Failure(ExitStatus status, const std::string& text)
      : Failure(status, text, UsualErrorOf(status)) {}
  Failure(ExitStatus status, const std::string& text, owner::Error error)
      : std::runtime_error(text), status_(status), error_(error) {}

  ExitStatus status() const { return status_; }
  // What the system log is told.
  owner::Error error() const { return error_; }

 private:
  ExitStatus status_;
  owner::Error error_;
};

// Somebody who was asked said no.
class Declined : public Failure {
 public:
  explicit Declined(const std::string& text) : Failure(ExitStatus::kFailed, text) {}
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
