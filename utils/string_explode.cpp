#include <tuvosharing/utils.h>

#include <cstring>

namespace TUVO::sharing {

bool StringExplode(std::vector<std::string>& out, const std::string& str, const char* separator) {
  if (separator == nullptr) {
    return false;
  }
  out.clear();
  const size_t length = std::strlen(separator);
  size_t start = 0;
  for (size_t at = str.find(separator); at != std::string::npos; at = str.find(separator, start)) {
    if (at > start) {
      out.push_back(str.substr(start, at - start));
    }
    start = at + length;
  }
  if (start < str.size()) {
    out.push_back(str.substr(start));
  }
  return true;
}

}  // namespace TUVO::sharing
