#include "cli/link_name.h"

#include <algorithm>
#include <charconv>
#include <set>

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

RowId RowIdOfDigits(const std::string& digits) {
  RowId id = 0;
  const char* end = digits.data() + digits.size();
  const auto [stop, error] = std::from_chars(digits.data(), end, id);
  if (error != std::errc() || stop != end || digits.empty()) {
    throw Failure(ExitStatus::kUsage, "#" + digits + ": is no row's number");
  }
  return id;
}

std::vector<owner::LinkName> WithoutRepeats(const std::vector<owner::LinkName>& names) {
  std::vector<owner::LinkName> unique;
  std::set<std::string> known;
  for (const owner::LinkName& name : names) {
    if (known.insert(TextOf(name)).second) {
      unique.push_back(name);
    }
  }
  return unique;
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
  names = WithoutRepeats(names);
  if (names.empty()) {
    throw Failure(ExitStatus::kUsage, "a link is needed: its hash, #ID, or --id ID");
  }
  return names;
}

std::vector<RowId> RowIdsOf(const std::vector<std::string>& texts,
                            const std::vector<std::string>& ids) {
  std::vector<RowId> rows;
  for (const std::string& text : texts) {
    if (text.empty() || text.front() != '#') {
      throw Failure(ExitStatus::kUsage, "--damaged: rows are named by their numbers, as #ID");
    }
    rows.push_back(RowIdOfDigits(text.substr(1)));
  }
  for (const std::string& id : ids) {
    rows.push_back(RowIdOfDigits(id));
  }
  if (rows.empty()) {
    throw Failure(ExitStatus::kUsage, "a row is needed: #ID, or --id ID");
  }
  std::sort(rows.begin(), rows.end());
  rows.erase(std::unique(rows.begin(), rows.end()), rows.end());
  return rows;
}

std::string TextOf(const owner::LinkName& name) {
  return name.id != 0 ? "#" + std::to_string(name.id) : name.hash;
}

}  // namespace cli
