// Times as texts: those of the records, of owners and of HTTP.
//
// Input: a number of seconds, a format, a text.
#include <tuvosharing/entry.h>

#include <cstdlib>
#include <ctime>
#include <optional>
#include <string>

#include "fixed_time.h"
#include "lines.h"
#include "owner/moment.h"
#include "target.h"
#include "visitor/http_date.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;

constexpr const char* kFormat = "%Y-%m-%d %H:%M:%S";

std::string TimeToText(std::time_t time, const char* format) {
  return TUVO::sharing::record::Entry().set_start_at(time).get_start_at_str(format);
}

std::time_t TextToTime(const std::string& text, const char* format) {
  return TUVO::sharing::record::Entry().set_start_at_str(text, format).get_start_at();
}

void CheckRecordTimes(std::time_t time, const std::string& format, const std::string& text) {
  const std::string shown = TimeToText(time, format.c_str());
  Require(shown.size() <= 127 && (time != 0 || shown.empty()), "a time's text has its limit");
  (void)TextToTime(text, format.c_str());
  (void)TextToTime(shown, format.c_str());
  Require(TextToTime("", format.c_str()) == 0, "no text, no time");
  // Within years of four digits, and up to the hour that summer time makes: which of the two it was
  // is not in the text.
  constexpr std::int64_t kYear10000 = 253402300800;
  if (time > 86400 && time < kYear10000 - 86400) {
    const std::time_t back = TextToTime(TimeToText(time, kFormat), kFormat);
    const std::time_t difference = back - time;
    Require(difference == 0 || difference == 3600 || difference == -3600,
            "a time comes back from its text");
  }
}

void CheckMoments(const std::string& text) {
  for (const owner::DayPart part : {owner::DayPart::kFirstSecond, owner::DayPart::kLastSecond}) {
    const std::optional<std::time_t> moment = owner::ParseMoment(text, fuzz::kNow, part);
    if (!moment) {
      continue;
    }
    Require(*moment > 0 && *moment <= owner::kLastMoment, "a moment is within its limits");
    const std::string shown = owner::MomentText(*moment);
    RequireEqual(shown, TimeToText(*moment, kFormat), "owners see the record's text");
    if (!text.empty() && text[0] != '+') {
      const auto again = owner::ParseMoment(shown, fuzz::kNow, part);
      Require(again == moment, "a moment's text is that moment");
    }
  }
}

void CheckHttpDates(std::time_t time, const std::string& text) {
  const std::string shown = visitor::HttpDate(time);
  constexpr std::int64_t kYear0 = -62167219200;
  constexpr std::int64_t kYear10000 = 253402300800;
  if (time >= kYear0 && time < kYear10000) {
    const auto back = visitor::ParseHttpDate(shown);
    Require(back == std::optional<std::time_t>(time), "a date comes back from its text");
  }
  const std::optional<std::time_t> read = visitor::ParseHttpDate(text);
  if (read && *read >= kYear0 && *read < kYear10000) {
    Require(visitor::ParseHttpDate(visitor::HttpDate(*read)) == read, "a date is read alike twice");
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  // A zone with summer time, that needs no file.
  static const int zone = setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1);
  Require(zone == 0, "there is a time zone");
  fuzz::Lines lines(data, size);
  const auto time = static_cast<std::time_t>(lines.Number());
  const std::string format = lines.Text();
  const std::string text = lines.Text();
  CheckRecordTimes(time, format, text);
  CheckMoments(text);
  CheckHttpDates(time, text);
  return 0;
}
