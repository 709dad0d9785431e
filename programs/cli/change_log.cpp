#include "cli/change_log.h"

#include <unistd.h>

#include "common/event_log.h"

namespace cli {

void LogChange(const char* event, int link, const owner::MaybeProblem& problem) {
  constexpr int kDone = 1;
  common::Event line;
  line.name = event;
  line.link = link;
  line.address = "local";
  line.result = problem ? static_cast<int>(problem->error) : kDone;
  line.by = getuid();
  common::LogEvent(line);
}

}  // namespace cli
