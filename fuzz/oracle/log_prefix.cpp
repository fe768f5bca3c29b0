#include "fuzz/oracle/log_prefix.h"

#include <climits>

namespace oracle {

namespace {

constexpr size_t kPart = 127;  // characters of the process, tag and time parts
constexpr int64_t kDay = 86400;

struct Date {
  int64_t year;
  int month;  // from 0
  int day;    // from 1
};

bool IsLeap(int64_t year) {
  return year % 4 == 0 && (year % 100 != 0 || year % 400 == 0);
}

// 400 years have 146,097 days, so only what is left of them is counted year by year.
Date DateOf(int64_t days) {
  constexpr int64_t kCycle = 146097;
  const int64_t cycles = (days >= 0 ? days : days - kCycle + 1) / kCycle;
  days -= cycles * kCycle;
  Date date = {1970 + cycles * 400, 0, 1};
  while (days >= (IsLeap(date.year) ? 366 : 365)) days -= IsLeap(date.year++) ? 366 : 365;
  const int lengths[] = {31, IsLeap(date.year) ? 29 : 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  while (days >= lengths[date.month]) days -= lengths[date.month++];
  date.day += static_cast<int>(days);
  return date;
}

std::string Padded(int64_t value, size_t width, char pad) {
  std::string text = std::to_string(value);
  while (text.size() < width) text.insert(0, 1, pad);
  return text;
}

// Empty for a year that the C library's record of a time cannot hold.
std::string TimePart(const LogCall& call) {
  static const char* const kMonths[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                        "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
  const int64_t days = (call.seconds >= 0 ? call.seconds : call.seconds - kDay + 1) / kDay;
  const int64_t second = call.seconds - days * kDay;
  const Date date = DateOf(days);
  if (date.year - 1900 > INT_MAX || date.year - 1900 < INT_MIN) return "";
  std::string text = std::string(kMonths[date.month]) + " " + Padded(date.day, 2, ' ') + " " +
                     Padded(second / 3600, 2, '0') + ":" + Padded(second / 60 % 60, 2, '0') + ":" +
                     Padded(second % 60, 2, '0');
  if (call.milliseconds) text += "." + Padded(call.microseconds / 1000, 3, '0');
  return text;
}

std::string ProcessPart(const LogCall& call) {
  const std::string process = "[" + std::to_string(call.pid) + "]";
  return call.pid == call.tid ? process : process + "[" + std::to_string(call.tid) + "]";
}

std::string TagPart(const LogCall& call) {
  if (!call.category || !call.level) return "";
  return ("[" + *call.category + "][" + *call.level + "]").substr(0, kPart);
}

}  // namespace

std::string BaseName(const std::string& path) {
  std::string name;
  for (const char c : path) {
    name += c;
    if (c == '/' || c == '\\') name.clear();
  }
  return name;
}

std::string LogLineOf(const LogCall& call) {
  return TimePart(call) + " " + ProcessPart(call) + TagPart(call) + " " + BaseName(call.file) +
         ":" + std::to_string(call.line) + ":" + call.function + "(): " + call.message;
}

}  // namespace oracle
