#include "visitor/answer.h"

#include <algorithm>
#include <stdexcept>

namespace visitor {

namespace {

constexpr std::string_view kLineEnd = "\r\n";
constexpr int kNotModified = 304;

constexpr std::string_view kEveryAnswer =
    "Cache-Control: no-store\r\n"
    "Referrer-Policy: no-referrer\r\n"
    "X-Robots-Tag: noindex\r\n"
    "X-Content-Type-Options: nosniff\r\n";

std::string_view ReasonOf(int status) {
  switch (status) {
    case 200:
      return "OK";
    case 206:
      return "Partial Content";
    case 302:
      return "Found";
    case 303:
      return "See Other";
    case kNotModified:
      return "Not Modified";
    case 400:
      return "Bad Request";
    case 403:
      return "Forbidden";
    case 404:
      return "Not Found";
    case 405:
      return "Method Not Allowed";
    case 410:
      return "Gone";
    case 412:
      return "Precondition Failed";
    case 416:
      return "Range Not Satisfiable";
    case 429:
      return "Too Many Requests";
    default:
      return "Internal Server Error";
  }
}

bool IsControl(char c) {
  return static_cast<unsigned char>(c) < ' ' || c == '\x7f';
}

void AppendLine(std::string_view name, std::string_view value, std::string* lines) {
  lines->append(name).append(": ").append(value).append(kLineEnd);
}

}  // namespace

void AddHeader(Answer* answer, std::string_view name, std::string_view value) {
  if (std::any_of(value.begin(), value.end(), IsControl)) {
    throw std::invalid_argument("control character in a header");
  }
  answer->headers.emplace_back(name, value);
}

std::string HeaderLines(const Answer& answer) {
  std::string lines;
  AppendLine("Status", std::to_string(answer.status) + " " + std::string(ReasonOf(answer.status)),
             &lines);
  for (const auto& [name, value] : answer.headers) {
    AppendLine(name, value, &lines);
  }
  if (answer.status != kNotModified) {
    AppendLine(
        "Content-Length",
        answer.file ? std::to_string(answer.file->length) : std::to_string(answer.body.size()),
        &lines);
  }
  return lines.append(kEveryAnswer);
}

}  // namespace visitor
