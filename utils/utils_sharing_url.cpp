#include <internal/log.h>
#include <internal/popen.h>
#include <tuvosharing/sharing_url.h>
#include <tuvosharing/utils.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace TUVO::sharing {

namespace {

constexpr char kTool[] = "/usr/tuvo/bin/tuvosharingurl";
constexpr int BUF_SIZE_ = 4096;
constexpr int TYPE_BUF_SIZE_ = 4;

// The line without its last character, whatever that is. A line that begins with a NUL byte is
// empty and has none.
std::string WithoutLast(const char* line) {
  const size_t length = std::strlen(line);
  return {line, length > 0 ? length - 1 : 0};
}

}  // namespace

bool GetSharingURL(const std::string& s1, int n, bool b, const std::string& s2,
                   const std::string& s3, std::string& url, _tag_SHARING_URL_TYPE& type) {
  const internal::Popen file(
      kTool, {"tuvosharingurl", s1, ToString<int const>(n), ToString<bool>(b), s2, s3});
  if (file.file == nullptr) {
    SHARING_LOG_PID("popen failed\n\n");
    return false;
  }
  char szUrl[BUF_SIZE_] = {};
  char szType[TYPE_BUF_SIZE_] = {};
  // Output that merely ends sets no errno; the line shall not show one from long before.
  errno = 0;
  // clang-format off
  // NOLINTBEGIN(modernize-use-nullptr)
  SHARING_RETURN_FALSE_IF(NULL == fgets(szUrl, BUF_SIZE_, file.file));
  url = WithoutLast(szUrl);
  errno = 0;
  SHARING_RETURN_FALSE_IF(NULL == fgets(szType, TYPE_BUF_SIZE_, file.file));
  // NOLINTEND(modernize-use-nullptr)
  // clang-format on
  type = static_cast<_tag_SHARING_URL_TYPE>(std::strtol(szType, nullptr, 10));
  return true;
}

bool GetSharingURL(const std::string& s1, int n, bool b, const std::string& s3, std::string& url,
                   _tag_SHARING_URL_TYPE& type) {
  return GetSharingURL(s1, n, b, "", s3, url, type);
}

}  // namespace TUVO::sharing
