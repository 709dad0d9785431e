#include <internal/time_text.h>

namespace TUVO::sharing {

namespace {

// localtime_r alone may go on with the time zone that it once found: only localtime is bound to
// look for a changed one, and tzset does.
bool ToLocal(std::time_t time, std::tm& local) {
  tzset();
  return localtime_r(&time, &local) != nullptr;
}

}  // namespace

std::string TimeToText(std::time_t time, const char* format) {
  std::tm local{};
  char text[128];
  if (time == 0 || format == nullptr || !ToLocal(time, local) ||
      std::strftime(text, sizeof text, format, &local) == 0) {
    return "";
  }
  return text;
}

std::time_t TextToTime(const std::string& text, const char* format) {
  std::tm parsed{};
  if (text.empty() || format == nullptr || strptime(text.c_str(), format, &parsed) == nullptr) {
    return 0;
  }
  std::tm local{};
  if (ToLocal(std::time(nullptr), local)) {
    parsed.tm_isdst = local.tm_isdst;
  }
  return std::mktime(&parsed);
}

}  // namespace TUVO::sharing
