// A reader of what the library's writer puts in front of a message. Time, thread, category and
// level may be missing.
#include "tools/twlogctl/log_line.h"

#include <charconv>

namespace {

constexpr char kMonths[][4] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                               "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};

// Abbreviations of other languages have up to so many bytes.
constexpr size_t kLongestMonth = 16;

// What is not read yet of a text.
class Cursor {
 public:
  explicit Cursor(std::string_view rest) : rest_(rest) {}

  std::string_view Rest() const { return rest_; }

  bool Skip(char expected) {
    if (rest_.empty() || rest_.front() != expected) return false;
    rest_.remove_prefix(1);
    return true;
  }

  bool Number(int* value) {
    const char* begin = rest_.data();
    const auto result = std::from_chars(begin, begin + rest_.size(), *value);
    if (result.ec != std::errc()) return false;
    rest_.remove_prefix(static_cast<size_t>(result.ptr - begin));
    return true;
  }

  // What stands before `end`, which is skipped as well.
  bool Until(std::string_view end, std::string_view* part) {
    const size_t found = rest_.find(end);
    if (found == std::string_view::npos) return false;
    *part = rest_.substr(0, found);
    rest_.remove_prefix(found + end.size());
    return true;
  }

 private:
  std::string_view rest_;
};

int MonthOf(std::string_view name) {
  for (int month = 0; month < 12; ++month) {
    if (name == kMonths[month]) return month;
  }
  return -1;
}

bool ParseDay(Cursor* cursor, int* day) {
  cursor->Skip(' ');  // days below ten are padded
  return cursor->Number(day) && *day >= 1 && *day <= 31 && cursor->Skip(' ');
}

bool ParseClock(Cursor* cursor, LogStamp* stamp) {
  return cursor->Number(&stamp->hour) && cursor->Skip(':') && cursor->Number(&stamp->minute) &&
         cursor->Skip(':') && cursor->Number(&stamp->second) && stamp->hour >= 0 &&
         stamp->hour < 24 && stamp->minute >= 0 && stamp->minute < 60 && stamp->second >= 0 &&
         stamp->second <= 60;
}

bool ParseStamp(Cursor* cursor, LogStamp* stamp) {
  // The writer leaves the time out when the clock's value cannot be converted.
  if (cursor->Skip(' ')) return true;
  std::string_view month;
  if (!cursor->Until(" ", &month) || month.size() > kLongestMonth) return false;
  if (!ParseDay(cursor, &stamp->day) || !ParseClock(cursor, stamp)) return false;
  if (cursor->Skip('.') && !cursor->Number(&stamp->millisecond)) return false;
  stamp->month = MonthOf(month);
  return cursor->Skip(' ');
}

bool ToNumber(std::string_view text, int* value) {
  Cursor cursor(text);
  return cursor.Number(value) && cursor.Rest().empty();
}

// Two brackets are process and thread, three a process and two names, four all of them.
bool ParseBrackets(Cursor* cursor, LogLine* line) {
  std::string_view parts[4];
  size_t count = 0;
  while (count < 4 && cursor->Skip('[')) {
    if (!cursor->Until("]", &parts[count++])) return false;
  }
  if (count == 0 || !cursor->Skip(' ') || !ToNumber(parts[0], &line->pid)) return false;
  line->tid = line->pid;
  const bool has_thread = count == 2 || count == 4;
  if (has_thread && !ToNumber(parts[1], &line->tid)) return false;
  if (count < 3) return true;
  line->category = parts[count - 2];
  line->level = parts[count - 1];
  return true;
}

// A file's name may hold colons, and so may a function's: the line number is the first part between
// two colons that is a number.
bool ParseSite(std::string_view site, LogLine* line) {
  for (size_t colon = site.find(':'); colon != std::string_view::npos;
       colon = site.find(':', colon + 1)) {
    Cursor cursor(site.substr(colon + 1));
    if (!cursor.Number(&line->line) || !cursor.Skip(':')) continue;
    line->file = site.substr(0, colon);
    line->function = cursor.Rest();
    return true;
  }
  return false;
}

}  // namespace

bool ParseLogLine(std::string_view text, LogLine* line) {
  *line = LogLine();
  Cursor cursor(text);
  if (!ParseStamp(&cursor, &line->stamp) || !ParseBrackets(&cursor, line)) return false;
  std::string_view site;
  if (!cursor.Until("(): ", &site) || site.find('\n') != std::string_view::npos) return false;
  line->message = cursor.Rest();
  return ParseSite(site, line);
}
