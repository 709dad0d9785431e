// Multipart bodies: as they come, or built of fields that then have to come out again.
//
// Input: the content type, how many parts may come, "1" for a body of the input's own; then the
// body, or three lines for each part: name, value, file name ("-": none).
#include <algorithm>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "cgi_multipart.h"
#include "cgi_request.h"
#include "lines.h"
#include "target.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;
using tuvo_platform::CgiField;

struct Part {
  std::string name;
  std::string value;
  std::string file;
};

std::string Built(const std::vector<Part>& parts, const std::string& boundary) {
  std::string body;
  for (const Part& part : parts) {
    body += "--" + boundary + "\r\nContent-Disposition: form-data; name=\"" + part.name + "\"";
    if (part.file != "-") {
      body += "; filename=\"" + part.file + "\"\r\nContent-Type: text/plain";
    }
    body += "\r\n\r\n" + part.value + "\r\n";
  }
  return body + "--" + boundary + "--\r\n";
}

// A text that stands between quotes as itself.
bool IsPlain(const std::string& text) {
  return text.find_first_of(std::string("\"\r\n\0", 4)) == std::string::npos &&
         (text.empty() || text.back() != '\\');
}

// Whether the part can be sent under that boundary: its value, and the line end behind it, must not
// look like a delimiter's beginning.
bool CanBeSent(const Part& part, const std::string& delimiter) {
  const bool is_file = part.file != "-";
  if (!IsPlain(part.name) || (is_file && !IsPlain(part.file))) {
    return false;
  }
  if (is_file) {
    return ("\r\n" + part.value + "\r\n").find("\r\n" + delimiter) == std::string::npos;
  }
  return part.name.find(delimiter) == std::string::npos &&
         part.value.find(delimiter) == std::string::npos &&
         part.value.find('\0') == std::string::npos;
}

// Reads what CleanMultipart makes, where the delimiter separates and nothing else can look like it.
std::vector<CgiField> FieldsOfClean(std::string_view text, const std::string& delimiter) {
  constexpr std::string_view kHeader = "\r\nContent-Disposition: form-data; name=\"";
  constexpr std::string_view kNameEnd = "\"\r\n\r\n";
  std::vector<CgiField> fields;
  while (text.substr(0, delimiter.size()) == delimiter) {
    text.remove_prefix(delimiter.size());
    if (text == "--\r\n") {
      return fields;
    }
    Require(text.substr(0, kHeader.size()) == kHeader, "every part begins with its header");
    text.remove_prefix(kHeader.size());
    const std::size_t name_end = text.find(kNameEnd);
    const std::size_t part_end = text.find("\r\n" + delimiter);
    Require(name_end != std::string_view::npos && part_end != std::string_view::npos &&
                name_end + kNameEnd.size() <= part_end,
            "every part has a name and an end");
    const std::size_t value = name_end + kNameEnd.size();
    fields.emplace_back(std::string(text.substr(0, name_end)),
                        std::string(text.substr(value, part_end - value)));
    text.remove_prefix(part_end + 2);
  }
  Require(text.empty() && fields.empty(), "the body ends with its last delimiter");
  return fields;
}

std::string Shown(const std::vector<CgiField>& fields) {
  std::string text;
  for (const CgiField& field : fields) {
    text += std::to_string(field.first.size()) + ":" + field.first + "=" +
            std::to_string(field.second.size()) + ":" + field.second + "\n";
  }
  return text;
}

// The whole way, through cgicc.
std::optional<std::vector<CgiField>> FieldsOfRequest(const std::string& content_type,
                                                     const std::string& body) {
  const std::string length = std::to_string(body.size());
  std::size_t taken = 0;
  const auto request = tuvo_platform::ParseCgiRequest(
      [&](const char* name) -> std::optional<std::string_view> {
        const std::string_view variable(name);
        return variable == "REQUEST_METHOD"   ? std::optional<std::string_view>("POST")
               : variable == "CONTENT_TYPE"   ? std::optional<std::string_view>(content_type)
               : variable == "CONTENT_LENGTH" ? std::optional<std::string_view>(length)
                                              : std::nullopt;
      },
      [&](char* data, std::size_t room) {
        const std::size_t count = std::min(room, body.size() - taken);
        std::copy_n(body.data() + taken, count, data);
        taken += count;
        return count;
      });
  return request ? std::optional<std::vector<CgiField>>(request->fields) : std::nullopt;
}

std::vector<Part> ReadParts(fuzz::Lines* lines) {
  std::vector<Part> parts;
  while (!lines->AtEnd()) {
    Part part;
    part.name = lines->Text();
    part.value = lines->Text();
    part.file = lines->Text();
    parts.push_back(std::move(part));
  }
  return parts;
}

// A well-formed body is taken, and gives the fields that it was built of.
void CheckBuilt(const std::vector<Part>& parts, const std::string& boundary, std::size_t limit,
                const std::optional<std::string>& clean) {
  const std::string delimiter = "--" + boundary;
  std::vector<CgiField> fields;
  for (const Part& part : parts) {
    if (!CanBeSent(part, delimiter)) {
      return;
    }
    if (part.file == "-") {
      fields.emplace_back(part.name, part.value);
    }
  }
  Require(clean.has_value() == (parts.size() <= limit),
          "a body of as many parts as may come is taken");
  if (clean) {
    RequireEqual(Shown(FieldsOfClean(*clean, delimiter)), Shown(fields), "the fields of the parts");
  }
}

void CheckClean(const std::string& body, const std::string& boundary, std::size_t limit,
                std::size_t left, const std::string& clean) {
  const std::string delimiter = "--" + boundary;
  const std::vector<CgiField> fields = FieldsOfClean(clean, delimiter);
  Require(left <= limit && fields.size() <= limit - left, "every part is counted");
  Require(clean.find('\0') == std::string::npos, "no zero bytes in texts");
  if (clean.empty()) {
    return;
  }
  std::size_t again_left = limit;
  const std::optional<std::string> again =
      tuvo_platform::CleanMultipart(clean, boundary, &again_left);
  Require(again.has_value() && limit - again_left == fields.size(), "a clean body is taken again");
  RequireEqual(*again, clean, "a clean body stays as it is");
  const auto through = FieldsOfRequest("multipart/form-data; boundary=\"" + boundary + "\"", body);
  if (through) {
    RequireEqual(Shown(*through), Shown(fields), "the fields of the request");
  } else {
    Require(
        body.size() > tuvo_platform::kMaxMultipartBody || limit - left > tuvo_platform::kMaxFields,
        "a body that is taken apart is not refused behind that");
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::Lines lines(data, size);
  const std::string content_type = lines.Text();
  const std::size_t limit = lines.Choice(2 * tuvo_platform::kMaxFields);
  const bool raw = lines.Flag();
  const std::optional<std::string> boundary = tuvo_platform::MultipartBoundary(content_type);
  if (!boundary) {
    const std::string body(lines.Rest());
    Require(!FieldsOfRequest("multipart/form-data;" + content_type, body) ||
                tuvo_platform::MultipartBoundary("multipart/form-data;" + content_type),
            "without a boundary a body is refused");
    return 0;
  }
  Require(!boundary->empty() && boundary->size() <= 70, "a boundary has 1 to 70 characters");
  std::vector<Part> parts;
  std::string body;
  if (raw) {
    body = lines.Rest();
  } else {
    parts = ReadParts(&lines);
    body = Built(parts, *boundary);
  }
  std::size_t left = limit;
  const std::optional<std::string> clean = tuvo_platform::CleanMultipart(body, *boundary, &left);
  if (!raw) {
    CheckBuilt(parts, *boundary, limit, clean);
  }
  if (clean) {
    CheckClean(body, *boundary, limit, left, *clean);
  }
  return 0;
}
