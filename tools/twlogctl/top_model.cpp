#include "tools/twlogctl/top_model.h"

#include <algorithm>
#include <optional>

#include "tools/common/names.h"
#include "tools/common/terminal.h"

namespace {

// Long enough for a steady figure, short enough to see the effect of a key.
constexpr std::chrono::seconds kRateSpan(5);

constexpr size_t kKeptLines = 2000;

LogAmount AmountIn(const NamedAmounts& amounts, LOG_CATEG category) {
  const auto found = amounts.find(Enum2String(category));
  return found == amounts.end() ? LogAmount() : found->second;
}

}  // namespace

TopModel::TopModel() : recent_(kRateSpan) {
  for (int category = 0; category < LOG_CATEG_COUNT; ++category) {
    order_.push_back(static_cast<LOG_CATEG>(category));
  }
}

std::chrono::seconds TopModel::RateSpan() {
  return kRateSpan;
}

void TopModel::Add(const LogMessage& message, Moment now) {
  recent_.Add(message, now);
  const LogLine* begin = message.line;
  const auto category = ParseCategory(begin != nullptr ? begin->category : "");
  if (category) lines_[*category] += AmountOf(message).lines;
  const std::string name(begin != nullptr ? begin->category : "");
  const int level = begin != nullptr ? LevelNumber(begin->level) : -1;
  for (std::string_view rest = message.text; !rest.empty();) {
    const std::string_view line = rest.substr(0, rest.find('\n'));
    log_.push_back({EscapeControls(line), level, name, logged_++});
    if (log_.size() > kKeptLines) log_.pop_front();
    rest.remove_prefix(std::min(rest.size(), line.size() + 1));
  }
}

void TopModel::Refresh(Moment now) {
  record_.Refresh();
  recent_.Advance(now);
  amounts_ = recent_.Amounts();
  if (sorted_) Sort();
}

LogAmount TopModel::Total() const {
  return amounts_.all;
}

std::vector<TopModel::Row> TopModel::Rows() const {
  std::vector<Row> rows;
  for (const LOG_CATEG category : order_) {
    rows.push_back({category, record_.Level(category), AmountIn(amounts_.categories, category),
                    lines_[category]});
  }
  return rows;
}

std::string TopModel::Only() const {
  return only_ ? Enum2String(order_[selected_]) : "";
}

const std::string& TopModel::Note() const {
  return refusal_.empty() ? record_.Note() : refusal_;
}

std::vector<const TopModel::Line*> TopModel::LastLines(size_t count) const {
  const std::string only = Only();
  std::vector<const Line*> lines;
  for (auto line = log_.rbegin(); line != log_.rend() && lines.size() < count; ++line) {
    if (held_ && line->number >= held_at_) continue;
    if (only.empty() || line->category == only) lines.push_back(&*line);
  }
  std::reverse(lines.begin(), lines.end());
  return lines;
}

void TopModel::Select(LOG_CATEG category) {
  selected_ =
      static_cast<size_t>(std::find(order_.begin(), order_.end(), category) - order_.begin());
}

// The selection stays on its category, and the categories that are silent in their order.
void TopModel::Sort() {
  const LOG_CATEG selected = order_[selected_];
  std::sort(order_.begin(), order_.end());
  if (sorted_) {
    std::stable_sort(order_.begin(), order_.end(), [this](LOG_CATEG a, LOG_CATEG b) {
      return AmountIn(amounts_.categories, a).lines > AmountIn(amounts_.categories, b).lines;
    });
  }
  Select(selected);
}

void TopModel::Move(int64_t rows) {
  const auto last = static_cast<int64_t>(order_.size()) - 1;
  selected_ =
      static_cast<size_t>(std::clamp<int64_t>(static_cast<int64_t>(selected_) + rows, 0, last));
}

void TopModel::SetLevel(int level) {
  if (!record_.SetLevel(order_[selected_], level)) refusal_ = "refused: " + record_.Note();
}

// A record may hold numbers that are no level; the first key brings them back among the levels.
void TopModel::ChangeLevel(int change) {
  const int level = record_.Level(order_[selected_]) + change;
  SetLevel(std::clamp<int>(level, LOG_LEVEL_ALARM, LOG_LEVEL_DEBUG3));
}

// Results: false for a key that does not choose a category.
bool TopModel::PressMoving(TopKey key, int64_t page) {
  constexpr int64_t kAll = LOG_CATEG_COUNT;
  const std::pair<TopKey, int64_t> steps[] = {
      {TopKey::kUp, -1},         {TopKey::kDown, 1},     {TopKey::kPageUp, -page},
      {TopKey::kPageDown, page}, {TopKey::kHome, -kAll}, {TopKey::kEnd, kAll},
  };
  for (const auto& [moving, rows] : steps) {
    if (key == moving) {
      Move(rows);
      return true;
    }
  }
  return false;
}

// Results: false for a key that does not change the level.
bool TopModel::PressChanging(TopKey key) {
  if (key == TopKey::kLess) {
    ChangeLevel(-1);
  } else if (key == TopKey::kMore) {
    ChangeLevel(1);
  } else if (key == TopKey::kNotice) {
    SetLevel(LOG_LEVEL_NOTICE);
  } else {
    return false;
  }
  return true;
}

void TopModel::PressViewing(TopKey key) {
  if (key == TopKey::kSort) {
    sorted_ = !sorted_;
    Sort();
  } else if (key == TopKey::kOnly) {
    only_ = !only_;
  } else if (key == TopKey::kHold) {
    held_ = !held_;
    held_at_ = logged_;
  } else if (key == TopKey::kHelp) {
    help_ = true;
  }
}

bool TopModel::Press(TopKey key, size_t page) {
  if (key == TopKey::kNone) return true;
  refusal_.clear();
  if (help_) {
    help_ = false;
    return true;
  }
  if (key == TopKey::kLeave) return false;
  const auto rows = static_cast<int64_t>(std::max<size_t>(page, 1));
  if (!PressMoving(key, rows) && !PressChanging(key)) PressViewing(key);
  return true;
}
