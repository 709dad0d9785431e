// Cookies, both ways: a request's Cookie header, and the Set-Cookie lines of an answer.
//
// Input: whether the request came over https; the header; then the queue's work, three lines each:
// name, value and path of a cookie to set (an empty name: the lines of the next name are written).
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "cgi_cookies.h"
#include "cookie_queue.h"
#include "lines.h"
#include "target.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;
using tuvo_platform::CgiField;

std::string Trimmed(const std::string& text) {
  const std::size_t begin = text.find_first_not_of(" \t");
  return begin == std::string::npos ? std::string()
                                    : text.substr(begin, text.find_last_not_of(" \t") - begin + 1);
}

// Written from the rules that cgi_cookies.h states.
std::vector<CgiField> Expected(const std::string& header) {
  std::vector<CgiField> cookies;
  for (std::size_t begin = 0; begin <= header.size();) {
    const std::size_t end = std::min(header.find(';', begin), header.size());
    const std::string piece = header.substr(begin, end - begin);
    begin = end + 1;
    const std::size_t equals = piece.find('=');
    if (equals == std::string::npos) {
      continue;
    }
    const std::string name = Trimmed(piece.substr(0, equals));
    std::string value = Trimmed(piece.substr(equals + 1));
    if (value.size() > 1 && value[0] == '"' && value[value.size() - 1] == '"') {
      value = value.substr(1, value.size() - 2);
    }
    if (!name.empty()) {
      cookies.emplace_back(name, value);
    }
  }
  return cookies;
}

void CheckHeader(const std::string& header) {
  const std::vector<CgiField> cookies = tuvo_platform::ParseCookies(header);
  Require(cookies == Expected(header), "the header's cookies");
}

struct Close {
  void operator()(std::FILE* file) const { std::fclose(file); }
};

// What the queue writes for the cookies called `name`, and their number.
std::string Written(tuvo_platform::CookieQueue* queue, const char* name, bool secure, int* count) {
  char* text = nullptr;
  std::size_t size = 0;
  {
    const std::unique_ptr<std::FILE, Close> out(open_memstream(&text, &size));
    Require(out != nullptr, "there is memory");
    *count = queue->Write(name, secure, out.get());
  }
  std::string written(text, size);
  std::free(text);
  return written;
}

// One line: nothing of a name, a value or a path may end it or add an attribute to it.
void CheckLine(const std::string& line, bool secure) {
  constexpr std::string_view kStart = "Set-Cookie: ";
  const std::string end = std::string("; HttpOnly; SameSite=Lax") + (secure ? "; Secure" : "");
  Require(line.compare(0, kStart.size(), kStart) == 0, "a line is a Set-Cookie header");
  Require(line.size() >= end.size() && line.substr(line.size() - end.size()) == end,
          "a line ends with its attributes");
  std::size_t semicolons = 0;
  for (const char c : line) {
    Require(c >= ' ' && c < '\x7f', "a line is printable ASCII");
    semicolons += c == ';' ? 1U : 0U;
  }
  Require(semicolons == (secure ? 4U : 3U), "a line has no further attributes");
}

void CheckWriting(tuvo_platform::CookieQueue* queue, const char* name, bool secure) {
  int count = 0;
  std::string text = Written(queue, name, secure, &count);
  int lines = 0;
  while (!text.empty()) {
    const std::size_t end = text.find("\r\n");
    Require(end != std::string::npos, "every line is ended");
    CheckLine(text.substr(0, end), secure);
    text.erase(0, end + 2);
    ++lines;
  }
  Require(lines == count, "the number of lines is answered");
  int again = 0;
  Require(Written(queue, name, secure, &again).empty() && again == 0,
          "what was written is forgotten");
}

void CheckQueue(fuzz::Lines* lines, bool secure) {
  tuvo_platform::CookieQueue queue;
  while (!lines->AtEnd()) {
    const std::string name = lines->Text();
    const std::string value = lines->Text();
    const std::string path = lines->Text();
    if (name.empty()) {
      CheckWriting(&queue, value.c_str(), secure);
    } else if (queue.Set(name, value, path)) {
      // A browser sends it back as it was set.
      const std::vector<CgiField> back = tuvo_platform::ParseCookies(name + "=" + value);
      Require(back.size() == 1, "a cookie that was set is one cookie");
      RequireEqual(back.front().first + "=" + back.front().second, name + "=" + value,
                   "a cookie comes back as it was set");
    }
  }
  CheckWriting(&queue, nullptr, secure);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::Lines lines(data, size);
  const bool secure = lines.Flag();
  CheckHeader(lines.Text());
  CheckQueue(&lines, secure);
  return 0;
}
