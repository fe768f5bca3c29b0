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

TopModel::TopModel() : m_recent(kRateSpan) {
  for (int category = 0; category < LOG_CATEG_COUNT; ++category) {
    m_order.push_back(static_cast<LOG_CATEG>(category));
  }
}

std::chrono::seconds TopModel::RateSpan() {
  return kRateSpan;
}

void TopModel::Add(const LogMessage& message, Moment now) {
  m_recent.Add(message, now);
  const LogLine* begin = message.line;
  const auto category = ParseCategory(begin != nullptr ? begin->category : "");
  if (category) m_lines[*category] += AmountOf(message).lines;
  const std::string name(begin != nullptr ? begin->category : "");
  const int level = begin != nullptr ? LevelNumber(begin->level) : -1;
  for (std::string_view rest = message.text; !rest.empty();) {
    const std::string_view line = rest.substr(0, rest.find('\n'));
    m_log.push_back({EscapeControls(line), level, name, m_logged++});
    if (m_log.size() > kKeptLines) m_log.pop_front();
    rest.remove_prefix(std::min(rest.size(), line.size() + 1));
  }
}

void TopModel::Refresh(Moment now) {
  m_record.Refresh();
  m_recent.Advance(now);
  m_amounts = m_recent.Amounts();
  if (m_sorted) Sort();
}

LogAmount TopModel::Total() const {
  return m_amounts.all;
}

std::vector<TopModel::Row> TopModel::Rows() const {
  std::vector<Row> rows;
  for (const LOG_CATEG category : m_order) {
    rows.push_back({category, m_record.Level(category), AmountIn(m_amounts.categories, category),
                    m_lines[category]});
  }
  return rows;
}

std::string TopModel::Only() const {
  return m_only ? Enum2String(m_order[m_selected]) : "";
}

const std::string& TopModel::Note() const {
  return m_refusal.empty() ? m_record.Note() : m_refusal;
}

std::vector<const TopModel::Line*> TopModel::LastLines(size_t count) const {
  const std::string only = Only();
  std::vector<const Line*> lines;
  for (auto line = m_log.rbegin(); line != m_log.rend() && lines.size() < count; ++line) {
    if (m_held && line->number >= m_heldAt) continue;
    if (only.empty() || line->category == only) lines.push_back(&*line);
  }
  std::reverse(lines.begin(), lines.end());
  return lines;
}

void TopModel::Select(LOG_CATEG category) {
  m_selected =
      static_cast<size_t>(std::find(m_order.begin(), m_order.end(), category) - m_order.begin());
}

// The selection stays on its category, and the categories that are silent in their order.
void TopModel::Sort() {
  const LOG_CATEG selected = m_order[m_selected];
  std::sort(m_order.begin(), m_order.end());
  if (m_sorted) {
    std::stable_sort(m_order.begin(), m_order.end(), [this](LOG_CATEG a, LOG_CATEG b) {
      return AmountIn(m_amounts.categories, a).lines > AmountIn(m_amounts.categories, b).lines;
    });
  }
  Select(selected);
}

void TopModel::Move(int64_t rows) {
  const auto last = static_cast<int64_t>(m_order.size()) - 1;
  m_selected =
      static_cast<size_t>(std::clamp<int64_t>(static_cast<int64_t>(m_selected) + rows, 0, last));
}

void TopModel::SetLevel(int level) {
  if (!m_record.SetLevel(m_order[m_selected], level)) m_refusal = "refused: " + m_record.Note();
}

// A record may hold numbers that are no level; the first key brings them back among the levels.
void TopModel::ChangeLevel(int change) {
  const int level = m_record.Level(m_order[m_selected]) + change;
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
    m_sorted = !m_sorted;
    Sort();
  } else if (key == TopKey::kOnly) {
    m_only = !m_only;
  } else if (key == TopKey::kHold) {
    m_held = !m_held;
    m_heldAt = m_logged;
  } else if (key == TopKey::kHelp) {
    m_help = true;
  }
}

bool TopModel::Press(TopKey key, size_t page) {
  if (key == TopKey::kNone) return true;
  m_refusal.clear();
  if (m_help) {
    m_help = false;
    return true;
  }
  if (key == TopKey::kLeave) return false;
  const auto rows = static_cast<int64_t>(std::max<size_t>(page, 1));
  if (!PressMoving(key, rows) && !PressChanging(key)) PressViewing(key);
  return true;
}
