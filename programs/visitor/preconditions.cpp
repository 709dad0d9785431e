#include "visitor/preconditions.h"

#include "visitor/http_date.h"

namespace visitor {

namespace {

constexpr std::string_view kWeakMark = "W/";

std::string_view TrimBlanks(std::string_view text) {
  constexpr std::string_view kBlanks = " \t";
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string_view::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

bool IsWeak(std::string_view tag) {
  return tag.substr(0, kWeakMark.size()) == kWeakMark;
}

// Whether the list of tags, or "*", covers `etag`. The comparison is weak or strong: our own tags
// are strong, so that the one difference is whether a weak tag in the list may match. Our tags hold
// no comma, so that a tag of somebody else's that does is merely never equal.
bool Covers(std::string_view list, std::string_view etag, bool weak_allowed) {
  if (TrimBlanks(list) == "*") {
    return true;
  }
  while (!list.empty()) {
    const size_t comma = list.find(',');
    std::string_view tag = TrimBlanks(list.substr(0, comma));
    list = comma == std::string_view::npos ? std::string_view() : list.substr(comma + 1);
    if (IsWeak(tag)) {
      if (!weak_allowed) {
        continue;
      }
      tag.remove_prefix(kWeakMark.size());
    }
    if (tag == etag) {
      return true;
    }
  }
  return false;
}

// A header that is no date is as good as none.
bool ChangedSince(const std::string& header, std::time_t modified) {
  const std::optional<std::time_t> date = ParseHttpDate(header);
  return date && modified > *date;
}

bool UnchangedSince(const std::string& header, std::time_t modified) {
  const std::optional<std::time_t> date = ParseHttpDate(header);
  return date && modified <= *date;
}

}  // namespace

Verdict Evaluate(const ConditionHeaders& headers, const Validators& validators) {
  const bool failed = headers.if_match.empty()
                          ? ChangedSince(headers.if_unmodified_since, validators.modified)
                          : !Covers(headers.if_match, validators.etag, false);
  if (failed) {
    return Verdict::kFailed;
  }
  const bool unmodified = headers.if_none_match.empty()
                              ? UnchangedSince(headers.if_modified_since, validators.modified)
                              : Covers(headers.if_none_match, validators.etag, true);
  return unmodified ? Verdict::kNotModified : Verdict::kSend;
}

bool RangeApplies(const std::string& if_range, const Validators& validators, std::time_t now) {
  if (if_range.empty()) {
    return true;
  }
  const std::string_view text = TrimBlanks(if_range);
  if (text.find('"') != std::string_view::npos) {
    return text == validators.etag;  // a weak tag is never equal
  }
  const std::optional<std::time_t> date = ParseHttpDate(std::string(text));
  return date && *date == validators.modified && now - validators.modified >= 2;
}

}  // namespace visitor
