#include "cgi_multipart.h"

#include <algorithm>

#include "cgi_text.h"

namespace tuvo_platform {

namespace {

constexpr size_t kMaxBoundary = 70;
constexpr std::string_view kBoundaryCharacters =
    "0123456789abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ'()+_,-./:=?";
constexpr std::string_view kLineEnd = "\r\n";
constexpr std::string_view kHeadersEnd = "\r\n\r\n";
constexpr std::string_view kLastMark = "--";

// One of dashes alone is well-formed too, but cgicc would find an ordinary delimiter within the
// last one, and take what lies between for a piece of the last field.
bool IsBoundary(std::string_view text) {
  return text.size() <= kMaxBoundary &&
         text.find_first_not_of(kBoundaryCharacters) == std::string_view::npos &&
         text.find_first_not_of('-') != std::string_view::npos;
}

// What a part's Content-Disposition header says.
struct Disposition {
  std::optional<std::string> name;
  bool is_file = false;
};

bool StartsWith(std::string_view text, std::string_view start) {
  return text.substr(0, start.size()) == start;
}

std::string_view WithoutPrefix(std::string_view text, size_t length) {
  text.remove_prefix(length);
  return text;
}

// Takes the quoted text that `*rest` begins with. A backslash escapes a quote and nothing else:
// browsers write backslashes as they are.
std::optional<std::string> TakeQuoted(std::string_view* rest) {
  std::string text;
  for (size_t at = 1; at < rest->size(); ++at) {
    const char c = (*rest)[at];
    if (c == '"') {
      rest->remove_prefix(at + 1);
      return text;
    }
    if (c == '\\' && at + 1 < rest->size() && (*rest)[at + 1] == '"') {
      ++at;
    }
    text.push_back((*rest)[at]);
  }
  return std::nullopt;
}

std::optional<std::string> TakeParameterValue(std::string_view* rest) {
  *rest = TrimBlanks(*rest);
  if (!rest->empty() && rest->front() == '"') {
    return TakeQuoted(rest);
  }
  const size_t end = std::min(rest->find(';'), rest->size());
  std::string text(TrimBlanks(rest->substr(0, end)));
  rest->remove_prefix(end);
  return text;
}

// Keeps what matters of one parameter; false when it is a second name.
bool NoteParameter(std::string_view key, std::string value, Disposition* disposition) {
  if (EqualsIgnoringCase(key, "name")) {
    if (disposition->name) {
      return false;
    }
    disposition->name = std::move(value);
  } else if (EqualsIgnoringCase(key, "filename") || EqualsIgnoringCase(key, "filename*")) {
    disposition->is_file = true;
  }
  return true;
}

// The value of a Content-Disposition header: form-data; name="..."; filename="..."
std::optional<Disposition> ParseDisposition(std::string_view rest) {
  if (!EqualsIgnoringCase(TrimBlanks(TakeUntil(';', &rest)), "form-data")) {
    return std::nullopt;
  }
  Disposition disposition;
  for (rest = TrimBlanks(rest); !rest.empty(); rest = TrimBlanks(rest)) {
    if (rest.find('=') == std::string_view::npos) {
      return std::nullopt;
    }
    const std::string_view key = TrimBlanks(TakeUntil('=', &rest));
    std::optional<std::string> value = TakeParameterValue(&rest);
    if (!value || !NoteParameter(key, std::move(*value), &disposition)) {
      return std::nullopt;
    }
    rest = TrimBlanks(rest);
    if (!rest.empty()) {
      if (rest.front() != ';') {
        return std::nullopt;
      }
      rest.remove_prefix(1);
    }
  }
  return disposition;
}

// Finds the one Content-Disposition among a part's headers.
std::optional<Disposition> FindDisposition(std::string_view headers) {
  std::optional<Disposition> found;
  while (!headers.empty()) {
    const size_t end = std::min(headers.find(kLineEnd), headers.size());
    std::string_view value = headers.substr(0, end);
    headers.remove_prefix(std::min(end + kLineEnd.size(), headers.size()));
    if (!EqualsIgnoringCase(TakeUntil(':', &value), "content-disposition")) {
      continue;
    }
    if (found) {
      return std::nullopt;
    }
    found = ParseDisposition(value);
    if (!found) {
      return std::nullopt;
    }
  }
  return found;
}

// A name that can be written between plain quotes.
bool IsPlainName(std::string_view name) {
  return std::none_of(name.begin(), name.end(),
                      [](char c) { return c == '"' || c == '\r' || c == '\n'; });
}

// Appends one part, given without its delimiters, to the rewritten body; false when malformed.
bool AppendPart(std::string_view part, const std::string& delimiter, std::string* out) {
  const size_t headers_end = part.find(kHeadersEnd);
  if (headers_end == std::string_view::npos) {
    return false;
  }
  const std::string_view headers = part.substr(0, headers_end);
  const std::string_view value = WithoutPrefix(part, headers_end + kHeadersEnd.size());
  const std::optional<Disposition> disposition = FindDisposition(headers);
  if (HoldsZeroByte(headers) || !disposition || !disposition->name) {
    return false;
  }
  if (disposition->is_file) {
    return true;
  }
  const std::string& name = *disposition->name;
  if (!IsPlainName(name) || HoldsZeroByte(value) || name.find(delimiter) != std::string::npos ||
      value.find(delimiter) != std::string_view::npos) {
    return false;
  }
  out->append(delimiter).append("\r\nContent-Disposition: form-data; name=\"").append(name);
  out->append("\"\r\n\r\n").append(value).append(kLineEnd);
  return true;
}

}  // namespace

std::optional<std::string> MultipartBoundary(std::string_view content_type) {
  TakeUntil(';', &content_type);
  while (!content_type.empty()) {
    std::string_view value = TakeUntil(';', &content_type);
    if (!EqualsIgnoringCase(TrimBlanks(TakeUntil('=', &value)), "boundary")) {
      continue;
    }
    value = TrimBlanks(value);
    if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
      value = value.substr(1, value.size() - 2);
    }
    if (!IsBoundary(value)) {
      return std::nullopt;
    }
    return std::string(value);
  }
  return std::nullopt;
}

std::optional<std::string> CleanMultipart(std::string_view body, const std::string& boundary,
                                          size_t* fields_left) {
  const std::string delimiter = "--" + boundary;
  const std::string next_delimiter = std::string(kLineEnd) + delimiter;
  if (!StartsWith(body, delimiter)) {
    return std::nullopt;
  }
  body.remove_prefix(delimiter.size());
  std::string out;
  while (StartsWith(body, kLineEnd)) {
    body.remove_prefix(kLineEnd.size());
    const size_t end = body.find(next_delimiter);
    if (end == std::string_view::npos || *fields_left == 0 ||
        !AppendPart(body.substr(0, end), delimiter, &out)) {
      return std::nullopt;
    }
    --*fields_left;
    body.remove_prefix(end + next_delimiter.size());
  }
  // Some clients leave out the very last line end.
  if (body != kLastMark && body != "--\r\n") {
    return std::nullopt;
  }
  if (!out.empty()) {
    out.append(delimiter).append("--\r\n");
  }
  return out;
}

}  // namespace tuvo_platform
