// What top shows and what its keys do, without the screen.
#ifndef TARNWICK_TOOLS_TWLOGCTL_TOP_MODEL_H_
#define TARNWICK_TOOLS_TWLOGCTL_TOP_MODEL_H_

#include <array>
#include <cstdint>
#include <deque>
#include <string>
#include <vector>

#include "tools/twlogctl/log_rates.h"
#include "tools/twlogctl/log_select.h"
#include "tools/twlogctl/top_record.h"

enum class TopKey {
  kNone,
  kUp,
  kDown,
  kPageUp,
  kPageDown,
  kHome,
  kEnd,
  kLess,
  kMore,
  kNotice,
  kSort,
  kOnly,
  kHold,
  kHelp,
  kLeave
};

class TopModel {
 public:
  struct Row {
    LOG_CATEG category;
    int level;
    LogAmount recent;  // of the last RateSpan()
    uint64_t lines;    // since the start
  };
  struct Line {
    std::string text;
    int level;  // -1 without a name
    std::string category;
    uint64_t number;
  };

  TopModel();

  void Add(const LogMessage& message, Moment now);

  // Looks at the record again and forgets old rates. Each second at least.
  void Refresh(Moment now);

  // `page` is the number of rows that the screen shows. Results: false to leave.
  bool Press(TopKey key, size_t page);

  std::vector<Row> Rows() const;
  LogAmount Total() const;
  static std::chrono::seconds RateSpan();

  // The last lines of the log, `count` at most, the oldest first.
  std::vector<const Line*> LastLines(size_t count) const;

  size_t Selected() const { return selected_; }
  bool Sorted() const { return sorted_; }
  bool Held() const { return held_; }
  bool Help() const { return help_; }

  // The only category whose lines are shown; empty for all.
  std::string Only() const;

  // The record's state, or what the last key could not do.
  const std::string& Note() const;

 private:
  bool PressMoving(TopKey key, int64_t page);
  bool PressChanging(TopKey key);
  void PressViewing(TopKey key);
  void Move(int64_t rows);
  void ChangeLevel(int change);
  void SetLevel(int level);
  void Sort();
  void Select(LOG_CATEG category);

  TopRecord record_;
  SlidingCounter recent_;
  LogAmounts amounts_;  // of recent_
  std::array<uint64_t, LOG_CATEG_COUNT> lines_ = {};
  std::vector<LOG_CATEG> order_;
  size_t selected_ = 0;  // in order_
  std::deque<Line> log_;
  uint64_t logged_ = 0;
  uint64_t held_at_ = 0;
  std::string refusal_;
  bool sorted_ = false;
  bool held_ = false;
  bool help_ = false;
  bool only_ = false;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_TOP_MODEL_H_
