#include "cli/link_file.h"

#include <json/value.h>

#include "cli/failure.h"
#include "cli/line_reader.h"
#include "cli/progress.h"
#include "owner/argument.h"

namespace cli {

namespace {

constexpr const char* kFormat = "format";
constexpr const char* kFormatName = "tuvosharing links";
constexpr const char* kVersion = "version";
constexpr int kVersionNumber = 1;
constexpr const char* kLinks = "links";
constexpr std::size_t kLongestLine = std::size_t{64} << 20;

std::string Line(const Json::Value& value) {
  return owner::WriteJson(value) + "\n";
}

Failure BadFile(const std::string& text) {
  return {ExitStatus::kUsage, text};
}

Json::Value NextLine(LineReader* reader, std::size_t index) {
  std::string line;
  if (!reader->Next(&line)) {
    throw BadFile(LineText(index) + ": the file was cut off; nothing was imported");
  }
  Json::Value json;
  if (!owner::ReadJson(line, &json) || !json.isObject()) {
    throw BadFile(LineText(index) + ": is no JSON object; nothing was imported");
  }
  return json;
}

void CheckFirstLine(LineReader* reader) {
  std::string line;
  Json::Value json;
  if (!reader->Next(&line) || !owner::ReadJson(line, &json) || !json.isObject() ||
      json[kFormat] != kFormatName) {
    throw BadFile("line 1: this is no file that export has written");
  }
  if (json[kVersion] != kVersionNumber) {
    throw BadFile("line 1: this program does not know the file's version");
  }
}

bool IsLastLine(const Json::Value& json) {
  return json.isMember(kLinks);
}

void CheckLastLine(const Json::Value& json, std::size_t links, LineReader* reader) {
  std::string line;
  if (json.size() != 1 || json[kLinks] != static_cast<Json::Int64>(links)) {
    throw BadFile(LineText(links) + ": lines are missing before; nothing was imported");
  }
  if (reader->Next(&line)) {
    throw BadFile(LineText(links + 1) + ": stands behind the end; nothing was imported");
  }
}

}  // namespace

std::string FirstLine() {
  Json::Value json;
  json[kFormat] = kFormatName;
  json[kVersion] = kVersionNumber;
  return Line(json);
}

std::string LineOf(const LinkRow& row) {
  return Line(JsonOf(row));
}

std::string LastLine(long long links) {
  Json::Value json;
  json[kLinks] = static_cast<Json::Int64>(links);
  return Line(json);
}

std::vector<LinkRow> ReadLinkFile(int fd) {
  LineReader reader(fd, kLongestLine);
  CheckFirstLine(&reader);
  std::vector<LinkRow> rows;
  Progress progress("read", 0);
  for (;;) {
    progress.Show(static_cast<long long>(rows.size()));
    const Json::Value json = NextLine(&reader, rows.size());
    if (IsLastLine(json)) {
      CheckLastLine(json, rows.size(), &reader);
      return rows;
    }
    std::optional<LinkRow> row = LinkRowOf(json);
    if (!row) {
      throw BadFile(LineText(rows.size()) + ": is no link; nothing was imported");
    }
    rows.push_back(std::move(*row));
  }
}

}  // namespace cli
