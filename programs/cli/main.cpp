// tuvosharing: sharing links for the machine's administrator, on the command line.
#include <unistd.h>

#include <clocale>
#include <exception>
#include <iostream>

#include "cli/command_line.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/output.h"
#include "cli/standard_output.h"
#include "common/arguments.h"
#include "common/core_dump.h"
#include "common/privileges.h"
#include "common/process_start.h"

namespace {

constexpr uid_t kRootUid = 0;
constexpr uid_t kSystemUid = 1;
constexpr gid_t kSystemGid = 1;

// By the real ids: a set-user-id bit on the program gives nobody more.
bool MayRun() {
  return (getuid() == kRootUid && geteuid() == kRootUid) ||
         (getuid() == kSystemUid && geteuid() == kSystemUid && getegid() == kSystemGid);
}

void TakeIdentity() {
  if (!MayRun()) {
    throw cli::Failure(cli::ExitStatus::kNotAllowed,
                       "runs as root or as the system account (uid 1, gid 1) only");
  }
  if (!common::DropPrivileges()) {
    throw cli::Failure(cli::ExitStatus::kFailed, "root could not be given up");
  }
  common::ForbidCore();  // behind the change of ids, with which the system decides anew
}

// Nothing more is said where nobody reads.
cli::ExitStatus AfterOutput(cli::ExitStatus status) {
  std::cout.flush();
  if (!std::cout) {
    cli::StopIfInterrupted();
    throw cli::Failure(cli::ExitStatus::kFailed, "the output cannot be written");
  }
  return status;
}

cli::ExitStatus Run(int argc, char** argv) {
  const std::function<cli::ExitStatus()> command = cli::ReadCommandLine(argc, argv);
  common::WipeArguments(argc, argv);
  if (!command) {
    return AfterOutput(cli::ExitStatus::kDone);
  }
  TakeIdentity();
  cli::NoteSignals();
  return AfterOutput(command());
}

}  // namespace

int main(int argc, char** argv) {
  if (!common::StartProcess()) {
    return static_cast<int>(cli::ExitStatus::kFailed);
  }
  std::ios::sync_with_stdio(false);
  const cli::StandardOutput output;
  // For the widths of characters; the texts are UTF-8 wherever the program is started.
  (void)std::setlocale(LC_CTYPE, "C.UTF-8");
  try {
    return static_cast<int>(Run(argc, argv));
  } catch (const cli::Failure& failure) {
    std::cout.flush();
    cli::Complain(failure.what());
    return static_cast<int>(failure.status());
  } catch (const cli::Interruption&) {
    std::cout.flush();
    cli::EndBySignal(cli::NotedSignal());
  } catch (const std::exception& error) {
    cli::Complain(error.what());
    return static_cast<int>(cli::ExitStatus::kFailed);
  }
}
