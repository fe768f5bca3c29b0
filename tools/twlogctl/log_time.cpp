#include "tools/twlogctl/log_time.h"

#include <cstdio>

#include "tools/common/units.h"

namespace {

using std::chrono::hours;
using std::chrono::milliseconds;
using std::chrono::seconds;

// How far the newest line may lie ahead of the present: another zone, a clock that was set back.
constexpr hours kAhead(24);

// A 29th of February may be so many years ago.
constexpr int kYearsBack = 8;

Moment FromTime(time_t time) {
  return Moment(seconds(time));
}

time_t ToTime(Moment moment) {
  return static_cast<time_t>(
      std::chrono::duration_cast<seconds>(moment.time_since_epoch()).count());
}

struct tm Local(Moment moment) {
  struct tm local = {};
  const time_t time = ToTime(moment);
  localtime_r(&time, &local);
  return local;
}

// No value when the day does not exist, of which mktime would make another one.
std::optional<time_t> LocalHour(int year, const LogStamp& stamp) {
  struct tm local = {};
  local.tm_year = year - 1900;
  local.tm_mon = stamp.month;
  local.tm_mday = stamp.day;
  local.tm_hour = stamp.hour;
  local.tm_isdst = -1;
  const time_t time = mktime(&local);
  if (local.tm_mday != stamp.day || local.tm_mon != stamp.month) return std::nullopt;
  return time;
}

// The start of the stamp's hour in the latest year that is not too far ahead.
std::optional<time_t> LatestHour(const LogStamp& stamp, Moment newest) {
  const Moment limit = newest + kAhead;
  const int last = Local(limit).tm_year + 1900;
  for (int year = last; year > last - kYearsBack; --year) {
    const std::optional<time_t> hour = LocalHour(year, stamp);
    if (hour && FromTime(*hour) <= limit) return hour;
  }
  return std::nullopt;
}

bool SameHour(const LogStamp& a, const LogStamp& b) {
  return a.month == b.month && a.day == b.day && a.hour == b.hour;
}

// strptime, of the whole text.
bool Matches(const std::string& text, const char* format, struct tm* result) {
  struct tm parsed = *result;
  const char* end = strptime(text.c_str(), format, &parsed);
  if (end == nullptr || *end != '\0') return false;
  *result = parsed;
  return true;
}

std::optional<Moment> ParseDate(const std::string& text) {
  for (const char* format :
       {"%Y-%m-%d %H:%M:%S", "%Y-%m-%dT%H:%M:%S", "%Y-%m-%d %H:%M", "%Y-%m-%dT%H:%M", "%Y-%m-%d"}) {
    struct tm local = {};
    if (!Matches(text, format, &local)) continue;
    const int day = local.tm_mday;
    local.tm_isdst = -1;
    const time_t time = mktime(&local);
    if (local.tm_mday != day) return std::nullopt;  // the 30th of February
    return FromTime(time);
  }
  return std::nullopt;
}

std::optional<Moment> ParseClock(const std::string& text, Moment now, Direction direction) {
  struct tm local = Local(now);
  local.tm_sec = 0;
  if (!Matches(text, "%H:%M:%S", &local) && !Matches(text, "%H:%M", &local)) return std::nullopt;
  local.tm_isdst = -1;
  struct tm other = local;
  const Moment today = FromTime(mktime(&other));
  if (direction == Direction::kBack && today > now) --local.tm_mday;
  if (direction == Direction::kAhead && today <= now) ++local.tm_mday;
  return FromTime(mktime(&local));
}

std::string Fraction(Moment moment) {
  char text[16];
  const auto part = moment.time_since_epoch() % seconds(1);
  snprintf(text, sizeof(text), ".%03d", static_cast<int>(part.count()));
  return text;
}

}  // namespace

Moment Now() {
  return std::chrono::time_point_cast<milliseconds>(std::chrono::system_clock::now());
}

std::optional<Moment> LogClock::MomentOf(const LogStamp& stamp) {
  if (stamp.month < 0) return std::nullopt;
  if (!SameHour(stamp, hour_)) {
    const std::optional<time_t> hour = LatestHour(stamp, newest_);
    if (!hour) return std::nullopt;
    hour_ = stamp;
    hour_start_ = *hour;
  }
  return FromTime(hour_start_) + seconds(stamp.minute * 60 + stamp.second) +
         milliseconds(stamp.millisecond < 0 ? 0 : stamp.millisecond);
}

std::optional<Moment> ParseMoment(std::string_view text, Moment now, Direction direction) {
  const std::string copy(text);
  if (const auto moment = ParseDate(copy)) return moment;
  if (const auto moment = ParseClock(copy, now, direction)) return moment;
  const auto span = ParseSpan(text);
  if (!span) return std::nullopt;
  return direction == Direction::kBack ? now - *span : now + *span;
}

std::string FormatMoment(Moment moment, bool milliseconds) {
  const struct tm local = Local(moment);
  char text[64];
  const size_t length = strftime(text, sizeof(text), "%Y-%m-%d %H:%M:%S", &local);
  return std::string(text, length) + (milliseconds ? Fraction(moment) : "");
}

std::string FormatClock(Moment moment) {
  const struct tm local = Local(moment);
  char text[64];
  return std::string(text, strftime(text, sizeof(text), "%H:%M:%S", &local));
}

std::string FormatIso(Moment moment) {
  const struct tm local = Local(moment);
  char date[64];
  char zone[16];
  const size_t date_length = strftime(date, sizeof(date), "%Y-%m-%dT%H:%M:%S", &local);
  const size_t zone_length = strftime(zone, sizeof(zone), "%z", &local);
  return std::string(date, date_length) + Fraction(moment) + std::string(zone, zone_length);
}
