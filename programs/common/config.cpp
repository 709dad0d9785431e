#include "common/config.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>
#include <string_view>

#include "common/unique_fd.h"

namespace common {

namespace {

constexpr size_t kNowhere = std::string_view::npos;
constexpr size_t kChunkSize = 4096;
constexpr std::string_view kBlanks = " \t\r";
constexpr std::string_view kByteOrderMark = "\xef\xbb\xbf";  // which some editors begin files with
constexpr std::string_view kExternalAddress = "external_address";

std::string_view Trim(std::string_view text) {
  const size_t begin = text.find_first_not_of(kBlanks);
  if (begin == std::string_view::npos) {
    return {};
  }
  return text.substr(begin, text.find_last_not_of(kBlanks) - begin + 1);
}

// A '#' within a word is part of it, since folders may have such names.
std::string_view WithoutComment(std::string_view line) {
  for (size_t at = line.find('#'); at != std::string_view::npos; at = line.find('#', at + 1)) {
    if (at == 0 || kBlanks.find(line[at - 1]) != std::string_view::npos) {
      return line.substr(0, at);
    }
  }
  return line;
}

bool HasControlCharacter(std::string_view text) {
  return std::any_of(text.begin(), text.end(),
                     [](char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7f; });
}

// The folder in its one spelling. Nothing for one that is not absolute, for "/" itself, which would
// open everything, and for "." and "..", which hide where a folder really is.
std::optional<std::string> Folder(std::string_view value) {
  if (value.empty() || value.front() != '/') {
    return std::nullopt;
  }
  std::string folder;
  while (!value.empty()) {
    value.remove_prefix(1);  // the slash
    const std::string_view part = value.substr(0, value.find('/'));
    if (part == "." || part == "..") {
      return std::nullopt;
    }
    if (!part.empty()) {
      folder.append("/").append(part);
    }
    value.remove_prefix(part.size());
  }
  if (folder.empty()) {
    return std::nullopt;
  }
  return folder;
}

bool AddFolder(std::string_view value, Config& config) {
  const std::optional<std::string> folder = Folder(value);
  if (!folder) {
    return false;
  }
  std::vector<std::string>& all = config.share_folders;
  if (std::find(all.begin(), all.end(), *folder) == all.end()) {
    all.push_back(*folder);
  }
  return true;
}

// What is wrong with the line; null when nothing is.
const char* ReadLine(std::string_view line, Config& config) {
  line = Trim(WithoutComment(line));
  if (line.empty()) {
    return nullptr;
  }
  const size_t equals = line.find('=');
  if (equals == std::string_view::npos) {
    return "is not of the form \"name = value\"";
  }
  const std::string_view name = Trim(line.substr(0, equals));
  const std::string_view value = Trim(line.substr(equals + 1));
  if (HasControlCharacter(value)) {
    return "has a control character in its value";
  }
  if (name == kExternalAddress) {
    config.external_address = value;
    return nullptr;
  }
  if (name == "share_folder") {
    return AddFolder(value, config) ? nullptr : "names no folder that can be opened for sharing";
  }
  return "has an unknown name";
}

// Why what is open is not believed; null when it is. The file decides what strangers may be given
// and where they are sent, so nobody but root may have a say in it.
const char* Doubt(const struct stat& status) {
  if (!S_ISREG(status.st_mode)) {
    return "is no regular file";
  }
  if (status.st_uid != 0) {
    return "belongs to another user than root";
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    return "can be written to by others than root";
  }
  return nullptr;
}

std::optional<std::string> ReadAll(int fd) {
  std::string text;
  char chunk[kChunkSize];
  for (;;) {
    const ssize_t length = read(fd, chunk, sizeof chunk);
    if (length < 0) {
      return std::nullopt;
    }
    if (length == 0) {
      return text;
    }
    text.append(chunk, static_cast<size_t>(length));
  }
}

std::nullopt_t CannotRead(const std::string& path) {
  syslog(LOG_ERR, "config:%d cannot read %s: %s", __LINE__, path.c_str(), std::strerror(errno));
  return std::nullopt;
}

// The file's text, empty when it is missing. Nothing, and a line in the log, when it cannot be
// used.
std::optional<std::string> FileText(const std::string& path) {
  // Without O_NONBLOCK a pipe in the file's place would be waited for.
  const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK));
  if (file.get() < 0) {
    return errno == ENOENT ? std::optional<std::string>("") : CannotRead(path);
  }
  struct stat status {};
  if (fstat(file.get(), &status) != 0) {
    return CannotRead(path);
  }
  if (const char* doubt = Doubt(status); doubt != nullptr) {
    syslog(LOG_ERR, "config:%d %s is not used: it %s", __LINE__, path.c_str(), doubt);
    return std::nullopt;
  }
  std::optional<std::string> text = ReadAll(file.get());
  return text ? text : CannotRead(path);
}

// Whether the line begins with the word `name`.
bool IsAbout(std::string_view name, std::string_view line) {
  line = Trim(line);
  const std::string_view behind = line.substr(std::min(name.size(), line.size()));
  return line.substr(0, name.size()) == name &&
         (behind.empty() || behind.front() == '=' || kBlanks.find(behind.front()) != kNowhere);
}

// Reads the lines about `name` alone; an empty name: all.
Config ReadLines(const std::string& path, std::string_view name) {
  const std::string text = FileText(path).value_or("");
  std::string_view rest = text;
  if (rest.substr(0, kByteOrderMark.size()) == kByteOrderMark) {
    rest.remove_prefix(kByteOrderMark.size());
  }
  Config config;
  for (int number = 1; !rest.empty(); ++number) {
    const std::string_view line = rest.substr(0, rest.find('\n'));
    rest.remove_prefix(std::min(line.size() + 1, rest.size()));
    if (!name.empty() && !IsAbout(name, line)) {
      continue;
    }
    if (const char* problem = ReadLine(line, config); problem != nullptr) {
      syslog(LOG_WARNING, "config:%d line %d of %s %s", __LINE__, number, path.c_str(), problem);
    }
  }
  return config;
}

}  // namespace

Config ReadConfig(const std::string& path) {
  return ReadLines(path, "");
}

std::string ReadExternalAddress(const std::string& path) {
  return ReadLines(path, kExternalAddress).external_address;
}

}  // namespace common
