// Settings from arguments: each by itself.
#include <tuvosharing/keys.h>
#include <tuvosharing/user_group.h>

#include <array>
#include <utility>

#include "common/hash_text.h"
#include "common/redirect_target.h"
#include "owner/moment.h"
#include "owner/settings.h"
#include "owner/text_check.h"

namespace owner {

namespace {

using TUVO::sharing::record::Entry;
// The names are those of the records' own JSON form.
using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)

constexpr size_t kLongestProject = 64;
constexpr size_t kLongestTitle = 255;
constexpr size_t kLongestPassword = 128;
constexpr size_t kLongestUri = 2048;
constexpr size_t kLargestObject = 65536;
constexpr size_t kMostValues = 10000;  // in memory the smallest takes fifty times its two bytes
constexpr Json::ArrayIndex kMostNames = 200;

// One argument being read; the problem names it.
class Reading {
 public:
  Reading(const Json::Value& arguments, const char* name)
      : name_(name), value_(arguments.get(name, Json::Value())) {}

  bool IsGiven() const { return !value_.isNull(); }
  const Json::Value& Value() const { return value_; }
  std::string Text() const { return value_.asString(); }
  MaybeProblem Bad(const std::string& message) const {
    return Fault(Error::kBadValue, message, name_);
  }

 private:
  const char* name_;
  Json::Value value_;
};

MaybeProblem ReadOwner(const Reading& reading, Settings* settings) {
  unsigned int uid = 0;
  if (!UserToUID(reading.Text(), uid)) {
    return reading.Bad("is no account of this system");
  }
  settings->owner_uid = uid;
  return std::nullopt;
}

MaybeProblem ReadPlainText(const Reading& reading, size_t shortest, size_t longest,
                           std::optional<std::string>* setting) {
  const std::string text = reading.Text();
  if (text.size() < shortest || text.size() > longest) {
    return reading.Bad("must have " + std::to_string(shortest) + " to " + std::to_string(longest) +
                       " bytes");
  }
  if (!IsPlainText(text)) {
    return reading.Bad("must not hold control characters");
  }
  *setting = text;
  return std::nullopt;
}

MaybeProblem ReadHash(const Reading& reading, Settings* settings) {
  if (!common::IsHashText(reading.Text())) {
    return reading.Bad("must be 3 to 64 of the characters A-Z, a-z, 0-9, - and _");
  }
  settings->hash = reading.Text();
  return std::nullopt;
}

MaybeProblem ReadBoolean(const Reading& reading, std::optional<bool>* setting) {
  *setting = reading.Value().asBool();
  return std::nullopt;
}

MaybeProblem ReadCount(const Reading& reading, std::optional<int>* setting) {
  if (reading.Value().asInt() < 0) {
    return reading.Bad("must be at least 0");
  }
  *setting = reading.Value().asInt();
  return std::nullopt;
}

MaybeProblem ReadMoment(const Reading& reading, std::time_t now, DayPart part,
                        std::optional<std::time_t>* setting) {
  if (reading.Text().empty()) {
    *setting = 0;
    return std::nullopt;
  }
  *setting = ParseMoment(reading.Text(), now, part);
  return *setting
             ? std::nullopt
             : reading.Bad("must be a time such as 2026-12-31 23:59, or +7d, before 2038-01-19");
}

template <typename Type>
MaybeProblem ReadChoice(const Reading& reading,
                        const std::array<std::pair<const char*, Type>, 3>& choices,
                        std::optional<Type>* setting) {
  for (const auto& [text, choice] : choices) {
    if (reading.Text() == text) {
      *setting = choice;
      return std::nullopt;
    }
  }
  return reading.Bad(std::string("must be ") + choices[0].first + ", " + choices[1].first + " or " +
                     choices[2].first);
}

MaybeProblem ReadNames(const Reading& reading, std::optional<std::vector<std::string>>* setting) {
  if (reading.Value().size() > kMostNames) {
    return reading.Bad("must be at most " + std::to_string(kMostNames) + " names");
  }
  std::vector<std::string> names;
  for (const Json::Value& item : reading.Value()) {
    names.push_back(item.asString());
    if (names.back().empty() || !IsPlainText(names.back())) {
      return reading.Bad("must hold names, not empty and without control characters");
    }
  }
  *setting = std::move(names);
  return std::nullopt;
}

MaybeProblem ReadUri(const Reading& reading, Settings* settings) {
  const std::string uri = reading.Text();
  if (uri.size() > kLongestUri) {
    return reading.Bad("must have at most " + std::to_string(kLongestUri) + " bytes");
  }
  // The visitor's program would refuse it later, and tell the visitor instead of the owner.
  if (!uri.empty() && !common::RedirectTarget(uri)) {
    return reading.Bad("must be an http or https address, or a path on this server");
  }
  settings->redirect_uri = uri;
  return std::nullopt;
}

// All values within `value`, itself counted.
size_t CountValues(const Json::Value& value) {
  size_t count = 1;
  for (const Json::Value& member : value) {
    count += CountValues(member);
  }
  return count;
}

MaybeProblem ReadObject(const Reading& reading, std::optional<Json::Value>* setting) {
  if (WriteJson(reading.Value()).size() > kLargestObject) {
    return reading.Bad("must be at most 64 KiB of JSON");
  }
  if (CountValues(reading.Value()) > kMostValues) {
    return reading.Bad("must hold at most " + std::to_string(kMostValues) + " values");
  }
  *setting = reading.Value();
  return std::nullopt;
}

// One at a time, in the order of SettingArguments.
class SettingReader {
 public:
  SettingReader(const Json::Value& arguments, Settings* settings)
      : arguments_(arguments), settings_(settings) {}

  // Calls `read` for the argument when it is given and nothing was wrong so far.
  template <typename Read>
  SettingReader& Take(const char* name, Read read) {
    const Reading reading(arguments_, name);
    if (!problem_ && reading.IsGiven()) {
      problem_ = read(reading, settings_);
    }
    return *this;
  }

  MaybeProblem FirstProblem() const { return problem_; }

 private:
  const Json::Value& arguments_;
  Settings* settings_;
  MaybeProblem problem_;
};

void TakeLife(SettingReader* reader, std::time_t now) {
  reader
      ->Take(SZK_ENABLED_,
             [](const Reading& r, Settings* s) { return ReadBoolean(r, &s->enabled); })
      .Take(SZK_START_AT,
            [now](const Reading& r, Settings* s) {
              return ReadMoment(r, now, DayPart::kFirstSecond, &s->start_at);
            })
      .Take(SZK_EXPIRE_AT,
            [now](const Reading& r, Settings* s) {
              return ReadMoment(r, now, DayPart::kLastSecond, &s->expire_at);
            })
      .Take(SZK_EXPIRE_TIMES,
            [](const Reading& r, Settings* s) { return ReadCount(r, &s->expire_times); })
      .Take(SZK_USE_COUNT,
            [](const Reading& r, Settings* s) { return ReadCount(r, &s->use_count); })
      .Take(SZK_AUTO_GC, [](const Reading& r, Settings* s) { return ReadBoolean(r, &s->auto_gc); })
      .Take(SZK_ENABLE_MATCH_IP,
            [](const Reading& r, Settings* s) { return ReadBoolean(r, &s->enable_match_ip); });
}

void TakeProtection(SettingReader* reader) {
  reader
      ->Take(SZK_PROTECT_TYPE,
             [](const Reading& r, Settings* s) {
               return ReadChoice<Entry::ProtectType>(
                   r,
                   {{{SZK_PROTECT_PROTECT_NONE, Entry::PROTECT_NONE},
                     {SZK_PROTECT_PROTECT_PASSWORD, Entry::PROTECT_PASSWORD},
                     {SZK_PROTECT_PROTECT_USER, Entry::PROTECT_USER}}},
                   &s->protect_type);
             })
      .Take(SZK_PROTECT_TITLE,
            [](const Reading& r, Settings* s) {
              return ReadPlainText(r, 0, kLongestTitle, &s->protect_title);
            })
      .Take(SZK_PROTECT_PASSWORD,
            [](const Reading& r, Settings* s) {
              return ReadPlainText(r, 1, kLongestPassword, &s->protect_password);
            })
      .Take(SZK_PROTECT_USERS,
            [](const Reading& r, Settings* s) { return ReadNames(r, &s->protect_users); })
      .Take(SZK_PROTECT_GROUPS,
            [](const Reading& r, Settings* s) { return ReadNames(r, &s->protect_groups); });
}

void TakeContent(SettingReader* reader) {
  reader
      ->Take(SZK_REDIRECT_TYPE,
             [](const Reading& r, Settings* s) {
               return ReadChoice<Entry::RedirectType>(
                   r,
                   {{{SZK_REDIRECT_REDIRECT_NONE, Entry::REDIRECT_NONE},
                     {SZK_REDIRECT_REDIRECT_URLPARAM, Entry::REDIRECT_URLPARAM},
                     {SZK_REDIRECT_REDIRECT_ALWAYS, Entry::REDIRECT_ALWAYS}}},
                   &s->redirect_type);
             })
      .Take(SZK_REDIRECT_URI, ReadUri)
      .Take(SZK_APP, [](const Reading& r, Settings* s) { return ReadObject(r, &s->app); })
      .Take(SZK_PRIVATE_DATA,
            [](const Reading& r, Settings* s) { return ReadObject(r, &s->private_data); });
}

}  // namespace

const std::vector<Argument>& SettingArguments() {
  static const std::vector<Argument> arguments = {{SZK_OWNER_USER, Kind::kText},
                                                  {SZK_PROJECT_NAME, Kind::kText},
                                                  {SZK_HASH, Kind::kText},
                                                  {SZK_ENABLED_, Kind::kBoolean},
                                                  {SZK_START_AT, Kind::kText},
                                                  {SZK_EXPIRE_AT, Kind::kText},
                                                  {SZK_EXPIRE_TIMES, Kind::kInteger},
                                                  {SZK_USE_COUNT, Kind::kInteger},
                                                  {SZK_AUTO_GC, Kind::kBoolean},
                                                  {SZK_ENABLE_MATCH_IP, Kind::kBoolean},
                                                  {SZK_PROTECT_TYPE, Kind::kText},
                                                  {SZK_PROTECT_TITLE, Kind::kText},
                                                  {SZK_PROTECT_PASSWORD, Kind::kText},
                                                  {SZK_PROTECT_USERS, Kind::kTextList},
                                                  {SZK_PROTECT_GROUPS, Kind::kTextList},
                                                  {SZK_REDIRECT_TYPE, Kind::kText},
                                                  {SZK_REDIRECT_URI, Kind::kText},
                                                  {SZK_APP, Kind::kObject},
                                                  {SZK_PRIVATE_DATA, Kind::kObject}};
  return arguments;
}

MaybeProblem ReadSettings(const Json::Value& arguments, std::time_t now, Settings* settings) {
  SettingReader reader(arguments, settings);
  reader.Take(SZK_OWNER_USER, ReadOwner)
      .Take(SZK_PROJECT_NAME,
            [](const Reading& r, Settings* s) {
              return ReadPlainText(r, 1, kLongestProject, &s->project_name);
            })
      .Take(SZK_HASH, ReadHash);
  TakeLife(&reader, now);
  TakeProtection(&reader);
  TakeContent(&reader);
  return reader.FirstProblem();
}

}  // namespace owner
