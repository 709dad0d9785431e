// Lines for the system log, at priority error.
//
// A line begins with the source file's name without folder and extension, and the line of the
// macro's use. errno is unchanged by writing one.
#ifndef INTERNAL_LOG_H_
#define INTERNAL_LOG_H_

#include <string>
#include <string_view>

namespace TUVO::sharing::internal {

constexpr std::string_view SourceStem(std::string_view path) {
  const size_t slash = path.rfind('/');
  const std::string_view name = slash == std::string_view::npos ? path : path.substr(slash + 1);
  return name.substr(0, name.rfind('.'));
}

// The text of errno, as "%m" would write it; the compiler's format check knows no "%m".
std::string ErrorText();

void LogError(std::string_view source, int line, const char* format, ...)
    __attribute__((format(printf, 3, 4)));
void LogErrorWithPid(std::string_view source, int line, const char* format, ...)
    __attribute__((format(printf, 3, 4)));

}  // namespace TUVO::sharing::internal

#define SHARING_SOURCE ::TUVO::sharing::internal::SourceStem(__FILE__)

// "base_db:12 text"
#define SHARING_LOG(...) ::TUVO::sharing::internal::LogError(SHARING_SOURCE, __LINE__, __VA_ARGS__)

// "base_db:12 (345) text"
#define SHARING_LOG_PID(...) \
  ::TUVO::sharing::internal::LogErrorWithPid(SHARING_SOURCE, __LINE__, __VA_ARGS__)

// Logs the condition's source text and returns false when it holds. The text is part of what people
// search their logs for, so uses are fenced from the formatter. Nothing in the condition may stand
// behind another macro of ours, which would change the text.
#define SHARING_RETURN_FALSE_IF(condition)                             \
  do {                                                                 \
    if (condition) {                                                   \
      SHARING_LOG_PID("Failed [%s], err=%s\n\n", #condition,           \
                      ::TUVO::sharing::internal::ErrorText().c_str()); \
      return false;                                                    \
    }                                                                  \
  } while (false)

#endif  // INTERNAL_LOG_H_
