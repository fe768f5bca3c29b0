#include "tools/twlogctl/log_rates.h"

#include <algorithm>

int64_t SecondOf(Moment moment) {
  return std::chrono::floor<std::chrono::seconds>(moment).time_since_epoch().count();
}

LogAmount AmountOf(const LogMessage& message) {
  const std::string_view text = message.text;
  const auto ends = static_cast<uint64_t>(std::count(text.begin(), text.end(), '\n'));
  const bool open = !text.empty() && text.back() != '\n';
  return {ends + (open ? 1 : 0), text.size()};
}

void LogAmount::Add(const LogAmount& other) {
  lines += other.lines;
  bytes += other.bytes;
}

void LogAmounts::Add(const LogAmount& amount, const LogLine* owner) {
  all.Add(amount);
  categories[std::string(owner != nullptr ? owner->category : "")].Add(amount);
  levels[std::string(owner != nullptr ? owner->level : "")].Add(amount);
  processes[owner != nullptr ? std::to_string(owner->pid) : ""].Add(amount);
}

namespace {

void AddAll(const NamedAmounts& from, NamedAmounts* to) {
  for (const auto& [name, amount] : from) (*to)[name].Add(amount);
}

}  // namespace

void LogAmounts::Add(const LogAmounts& other) {
  all.Add(other.all);
  AddAll(other.categories, &categories);
  AddAll(other.levels, &levels);
  AddAll(other.processes, &processes);
}

std::vector<std::pair<std::string, LogAmount>> LoudestFirst(const NamedAmounts& amounts) {
  std::vector<std::pair<std::string, LogAmount>> sorted(amounts.begin(), amounts.end());
  std::stable_sort(sorted.begin(), sorted.end(), [](const auto& a, const auto& b) {
    if (a.second.lines != b.second.lines) return a.second.lines > b.second.lines;
    return a.second.bytes > b.second.bytes;
  });
  return sorted;
}

void LogCounter::Add(const LogMessage& message) {
  const LogAmount amount = AmountOf(message);
  amounts_.Add(amount, message.line);
  if (message.moment) {
    first_ = std::min(first_.value_or(*message.moment), *message.moment);
    last_ = std::max(last_.value_or(*message.moment), *message.moment);
  }
  // What has no time was written after what stands in front of it.
  if (last_) lines_[SecondOf(message.moment.value_or(*last_))] += amount.lines;
}

void SlidingCounter::Add(const LogMessage& message, Moment now) {
  seconds_[SecondOf(message.moment.value_or(now))].Add(AmountOf(message), message.line);
}

void SlidingCounter::Advance(Moment now) {
  seconds_.erase(seconds_.begin(), seconds_.upper_bound(SecondOf(now - window_)));
}

LogAmounts SlidingCounter::Amounts() const {
  LogAmounts sum;
  for (const auto& entry : seconds_) sum.Add(entry.second);
  return sum;
}

std::map<int64_t, uint64_t> SlidingCounter::LinesBySecond() const {
  std::map<int64_t, uint64_t> lines;
  for (const auto& [second, amounts] : seconds_) lines[second] = amounts.all.lines;
  return lines;
}
