#include "cli/change_log.h"

#include <unistd.h>

#include "cli/failure.h"
#include "cli/interrupt.h"
#include "common/event_log.h"

namespace cli {

namespace {

// A process runs one command.
bool has_logged = false;

void LogOnce(const char* event, owner::Error error) {
  if (!has_logged) {
    LogChange(event, 0, owner::Fault(error, {}));
  }
}

}  // namespace

void LogChange(const char* event, int link, const owner::MaybeProblem& problem) {
  constexpr int kDone = 1;
  common::Event line;
  line.name = event;
  line.link = link;
  line.address = "local";
  line.result = problem ? static_cast<int>(problem->error) : kDone;
  line.by = getuid();
  common::LogEvent(line);
  has_logged = true;
}

ExitStatus LogRefusal(const char* event, const std::function<ExitStatus()>& command) {
  try {
    return command();
  } catch (const Declined&) {
    throw;
  } catch (const Failure& failure) {
    LogOnce(event, failure.error());
    throw;
  } catch (const Interruption&) {
    throw;
  } catch (const std::exception&) {
    LogOnce(event, owner::Error::kInternal);
    throw;
  }
}

}  // namespace cli
