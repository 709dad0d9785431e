#include <internal/log.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace TUVO::sharing::internal {

namespace {

// Longer than any of the library's formats with its prefix; values are filled in by syslog.
constexpr size_t kFormatSize = 512;

void Write(const char* prefix, const char* format, va_list arguments, int error) {
  char whole[kFormatSize];
  (void)std::snprintf(whole, sizeof whole, "%s%s", prefix, format);
  vsyslog(LOG_ERR, whole, arguments);
  errno = error;
}

}  // namespace

std::string ErrorText() {
  const int error = errno;
  char buffer[256];
  std::string text = strerror_r(error, buffer, sizeof buffer);
  errno = error;
  return text;
}

void LogError(std::string_view source, int line, const char* format, ...) {
  const int error = errno;
  char prefix[128];
  (void)std::snprintf(prefix, sizeof prefix, "%.*s:%d ", static_cast<int>(source.size()),
                      source.data(), line);
  va_list arguments;
  va_start(arguments, format);
  Write(prefix, format, arguments, error);
  va_end(arguments);
}

void LogErrorWithPid(std::string_view source, int line, const char* format, ...) {
  const int error = errno;
  char prefix[128];
  (void)std::snprintf(prefix, sizeof prefix, "%.*s:%d (%u) ", static_cast<int>(source.size()),
                      source.data(), line, static_cast<unsigned int>(getpid()));
  va_list arguments;
  va_start(arguments, format);
  Write(prefix, format, arguments, error);
  va_end(arguments);
}

}  // namespace TUVO::sharing::internal
