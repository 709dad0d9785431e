#include "cli/link_name.h"

#include <charconv>

#include "cli/failure.h"

namespace cli {

namespace {

owner::LinkName ById(const std::string& digits) {
  owner::LinkName name;
  const char* end = digits.data() + digits.size();
  const auto [stop, error] = std::from_chars(digits.data(), end, name.id);
  if (error != std::errc() || stop != end || name.id <= 0) {
    throw Failure(ExitStatus::kUsage, "#" + digits + ": is no link's number");
  }
  return name;
}

}  // namespace

owner::LinkName LinkNameOf(const std::string& text) {
  if (!text.empty() && text.front() == '#') {
    return ById(text.substr(1));
  }
  if (text.empty()) {
    throw Failure(ExitStatus::kUsage, "a link is named by its hash or by #ID");
  }
  return {0, text};
}

std::vector<owner::LinkName> LinkNamesOf(const std::vector<std::string>& texts,
                                         const std::vector<std::string>& ids) {
  std::vector<owner::LinkName> names;
  names.reserve(texts.size() + ids.size());
  for (const std::string& text : texts) {
    names.push_back(LinkNameOf(text));
  }
  for (const std::string& id : ids) {
    names.push_back(ById(id));
  }
  if (names.empty()) {
    throw Failure(ExitStatus::kUsage, "a link is needed: its hash, #ID, or --id ID");
  }
  return names;
}

std::string TextOf(const owner::LinkName& name) {
  return name.id != 0 ? "#" + std::to_string(name.id) : name.hash;
}

}  // namespace cli
