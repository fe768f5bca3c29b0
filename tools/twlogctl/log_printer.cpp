#include "tools/twlogctl/log_printer.h"

#include <json/value.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <string>

#include "tarnwick/log/twdebuglog.h"
#include "tools/common/json_output.h"
#include "tools/common/terminal.h"

namespace {

void Put(std::string_view text) {
  fwrite(text.data(), 1, text.size(), stdout);
}

Colour ColourOf(const LogLine* line) {
  switch (line == nullptr ? -1 : LevelNumber(line->level)) {
    case LOG_LEVEL_ALARM:
    case LOG_LEVEL_ERROR:
      return Colour::kRed;
    case LOG_LEVEL_WARN:
      return Colour::kYellow;
    case LOG_LEVEL_INFO:
      return Colour::kCyan;
    case LOG_LEVEL_DEBUG:
    case LOG_LEVEL_DEBUG2:
    case LOG_LEVEL_DEBUG3:
      return Colour::kGrey;
    default:
      return Colour::kNone;
  }
}

std::string_view WithoutLineEnd(std::string_view text) {
  if (!text.empty() && text.back() == '\n') text.remove_suffix(1);
  return text;
}

Json::Value JsonText(std::string_view text) {
  return Json::Value(text.data(), text.data() + text.size());
}

// A line without names has none in the record either.
Json::Value JsonName(std::string_view name) {
  return name.empty() ? Json::Value() : JsonText(name);
}

Json::Value ToJson(const LogMessage& message) {
  const LogLine* line = message.line;
  Json::Value value(Json::objectValue);
  value["time"] = message.moment ? Json::Value(FormatIso(*message.moment)) : Json::Value();
  value["pid"] = line != nullptr ? Json::Value(line->pid) : Json::Value();
  value["tid"] = line != nullptr ? Json::Value(line->tid) : Json::Value();
  value["category"] = line != nullptr ? JsonName(line->category) : Json::Value();
  value["level"] = line != nullptr ? JsonName(line->level) : Json::Value();
  value["file"] = line != nullptr ? JsonText(line->file) : Json::Value();
  value["line"] = line != nullptr ? Json::Value(line->line) : Json::Value();
  value["function"] = line != nullptr ? JsonText(line->function) : Json::Value();
  if (message.doubtful) value["doubtful"] = true;
  value["message"] = JsonText(WithoutLineEnd(line != nullptr ? line->message : message.text));
  return value;
}

}  // namespace

LogPrinter::LogPrinter(bool json, bool mark)
    : json_(json),
      terminal_(IsTerminal(STDOUT_FILENO)),
      mark_(mark || terminal_),
      colour_(MayColour(STDOUT_FILENO)) {}

void LogPrinter::PrintText(const LogMessage& message) {
  if (!mark_) return Put(message.text);
  const Colour colour = ColourOf(message.line);
  std::string_view rest = message.text;
  const char* mark = message.continues ? "| " : message.doubtful ? "? " : "";
  while (!rest.empty()) {
    const std::string_view line = rest.substr(0, rest.find('\n'));
    Put(mark);
    terminal_ ? Put(InColour(colour, EscapeControls(line), colour_)) : Put(line);
    Put("\n");
    rest.remove_prefix(std::min(rest.size(), line.size() + 1));
    mark = "| ";
  }
}

void LogPrinter::Print(const LogMessage& message) {
  if (!json_) return PrintText(message);
  Put(CompactJson(ToJson(message)));
  Put("\n");
}

bool LogPrinter::Flush() {
  return fflush(stdout) == 0 && ferror(stdout) == 0;
}
