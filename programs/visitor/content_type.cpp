#include "visitor/content_type.h"

#include <algorithm>
#include <fstream>
#include <sstream>

namespace visitor {

namespace {

constexpr const char* kListPath = "/etc/mime.types";
constexpr const char* kAnyBytes = "application/octet-stream";

std::string Lower(std::string_view text) {
  std::string out(text);
  std::transform(out.begin(), out.end(), out.begin(), [](char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
  });
  return out;
}

// Empty when there is none; a name that merely begins with a dot has none.
std::string ExtensionOf(std::string_view file_name) {
  const size_t dot = file_name.rfind('.');
  return dot == std::string_view::npos || dot == 0 ? std::string()
                                                   : Lower(file_name.substr(dot + 1));
}

// Visible ASCII and one slash: what may stand in a header and looks like a type.
bool IsType(const std::string& text) {
  return std::count(text.begin(), text.end(), '/') == 1 &&
         std::all_of(text.begin(), text.end(), [](char c) { return c > ' ' && c < '\x7f'; });
}

}  // namespace

std::string ContentTypeOf(std::string_view file_name, std::istream& list) {
  const std::string wanted = ExtensionOf(file_name);
  if (wanted.empty()) {
    return kAnyBytes;
  }
  for (std::string line; std::getline(list, line);) {
    std::istringstream words(line.substr(0, line.find('#')));
    std::string type;
    words >> type;
    for (std::string extension; words >> extension;) {
      if (Lower(extension) == wanted && IsType(type)) {
        return type;
      }
    }
  }
  return kAnyBytes;
}

std::string ContentTypeOf(std::string_view file_name) {
  std::ifstream list(kListPath);
  return ContentTypeOf(file_name, list);
}

}  // namespace visitor
