#include "tools/twlogctl/log_filter.h"

#include <regex.h>

#include <algorithm>
#include <utility>

#include "tarnwick/log/twdebuglog.h"

struct TextPattern::Compiled {
  regex_t regex;
};

TextPattern::TextPattern(std::unique_ptr<Compiled> compiled) : compiled_(std::move(compiled)) {}

TextPattern::~TextPattern() {
  regfree(&compiled_->regex);
}

std::shared_ptr<const TextPattern> TextPattern::Compile(const std::string& text,
                                                        std::string* error) {
  auto compiled = std::make_unique<Compiled>();
  const int code = regcomp(&compiled->regex, text.c_str(), REG_EXTENDED | REG_NOSUB | REG_NEWLINE);
  if (code == 0) {
    return std::shared_ptr<const TextPattern>(new TextPattern(std::move(compiled)));
  }
  char reason[256];
  regerror(code, &compiled->regex, reason, sizeof(reason));
  *error = reason;
  return nullptr;
}

bool TextPattern::Finds(std::string_view text) const {
  regmatch_t range = {};
  range.rm_eo = static_cast<regoff_t>(text.size());
  return regexec(&compiled_->regex, text.data(), 1, &range, REG_STARTEND) == 0;
}

int LevelNumber(std::string_view name) {
  for (int level = LOG_LEVEL_ALARM; level <= LOG_LEVEL_DEBUG3; ++level) {
    if (name == Enum2String(static_cast<LOG_LEVEL>(level))) return level;
  }
  return -1;
}

namespace {

template <typename List, typename Value>
bool EmptyOrHas(const List& list, const Value& value) {
  return list.empty() || std::find(list.begin(), list.end(), value) != list.end();
}

}  // namespace

bool LogFilter::WantsTime(std::optional<Moment> moment) const {
  if (!since && !until) return true;
  return moment && (!since || *moment >= *since) && (!until || *moment < *until);
}

bool LogFilter::WantsLine(const LogLine& line) const {
  if (!EmptyOrHas(categories, line.category) || !EmptyOrHas(pids, line.pid)) return false;
  if (!level) return true;
  const int number = LevelNumber(line.level);
  return number >= 0 && number <= *level;
}

bool LogFilter::NeedsLine() const {
  return !categories.empty() || !pids.empty() || level;
}

bool LogFilter::Wants(std::string_view message, const LogLine* line,
                      std::optional<Moment> moment) const {
  if (line == nullptr ? NeedsLine() : !WantsLine(*line)) return false;
  if (!WantsTime(moment)) return false;
  if (!text.empty() && message.find(text) == std::string_view::npos) return false;
  return pattern == nullptr || pattern->Finds(message);
}
