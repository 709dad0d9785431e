#include "common/cgi_exchange.h"

#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <utility>

#include "common/stream.h"

namespace common {

size_t CgiExchange::Read(char* data, size_t size) {
  ssize_t count = 0;
  do {
    count = read(STDIN_FILENO, data, size);
  } while (count < 0 && errno == EINTR);
  return count < 0 ? 0 : static_cast<size_t>(count);
}

bool CgiExchange::Write(std::string_view bytes) {
  return WriteAll(STDOUT_FILENO, bytes);
}

bool CgiExchange::WriteFile(int fd, std::int64_t offset, std::int64_t length) {
  (void)std::signal(SIGTERM, SIG_IGN);
  return CopyAll(fd, offset, length, STDOUT_FILENO);
}

bool CgiExchange::Finish() {
  if (std::exchange(finished_, true)) {
    return true;
  }
  (void)std::signal(SIGTERM, SIG_IGN);
  return std::fclose(stdout) == 0;
}

}  // namespace common
