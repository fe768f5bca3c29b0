#include "tools/twlogctl/top_screen.h"

#include <ncurses.h>

#include <algorithm>
#include <cstdio>
#include <cwchar>

#include "tools/common/terminal.h"
#include "tools/common/units.h"
#include "tools/twlogctl/report.h"

namespace {

constexpr int kLeastRows = 10;
constexpr int kLeastColumns = 40;

// Title, record, heading; line above the log; keys.
constexpr int kRowsAbove = 3;
constexpr int kFixedRows = 5;

constexpr const char* kHelp[] = {
    "twlogctl top: the levels and the log of all daemons",
    "",
    "Up, Down, PgUp, PgDn    choose a category",
    "Home, End               the first one, the last one",
    "Left, Right             write less of it, write more of it",
    "n                       back to notice",
    "s                       the loudest first, or by name",
    "o                       only this category's lines below, or all",
    "Space                   hold the log, or let it go on",
    "q                       leave",
    "",
    "Levels, from the most severe: alarm error warn notice info",
    "debug debug2 debug3. A category writes its level and the more",
    "severe ones. A change counts at once, in every daemon, until",
    "the next change: \"twlogctl save\" makes it last.",
    "Rates are those of the last 5 seconds.",
    "",
    "Any key goes back.",
};

enum LevelColour : short { kSevere = 1, kWarning, kInformation };

chtype AttributeOf(int level) {
  if (level < 0) return A_NORMAL;
  if (level <= LOG_LEVEL_ERROR) return static_cast<chtype>(COLOR_PAIR(kSevere)) | A_BOLD;
  if (level == LOG_LEVEL_WARN) return static_cast<chtype>(COLOR_PAIR(kWarning));
  if (level == LOG_LEVEL_NOTICE) return A_NORMAL;
  if (level == LOG_LEVEL_INFO) return static_cast<chtype>(COLOR_PAIR(kInformation));
  return A_DIM;
}

// As much of `text` as fits into `columns`; what the locale cannot show becomes a question mark.
std::string Fit(const std::string& text, int columns) {
  std::string fitting;
  std::mbstate_t state = {};
  for (size_t at = 0; at < text.size();) {
    wchar_t character = 0;
    size_t length = std::mbrtowc(&character, text.data() + at, text.size() - at, &state);
    const bool valid = length > 0 && length <= text.size() - at;
    const int width = valid ? wcwidth(character) : -1;
    if (!valid) {
      length = 1;
      state = {};
    }
    columns -= width < 0 ? 1 : width;
    if (columns < 0) break;
    fitting += width < 0 ? "?" : text.substr(at, length);
    at += length;
  }
  return fitting;
}

void DrawLine(int row, const std::string& text, chtype attribute) {
  attrset(static_cast<int>(attribute));
  move(row, 0);
  clrtoeol();
  addstr(Fit(text, COLS).c_str());
  attrset(A_NORMAL);
}

// A line in reverse video reaches to the edge.
void DrawBar(int row, const std::string& text, chtype attribute) {
  DrawLine(row, text, attribute);
  mvchgat(row, 0, -1, static_cast<attr_t>(attribute), static_cast<short>(PAIR_NUMBER(attribute)),
          nullptr);
}

std::string Rate(const LogAmount& amount) {
  const auto span = static_cast<double>(TopModel::RateSpan().count());
  char text[64];
  snprintf(text, sizeof(text), "%9.1f %10s/s", static_cast<double>(amount.lines) / span,
           FormatBytes(static_cast<double>(amount.bytes) / span).c_str());
  return text;
}

void DrawCategories(const TopModel& model) {
  const std::vector<TopModel::Row> rows = model.Rows();
  const size_t shown = CategoryRows();
  // The selected one is kept in the middle.
  const size_t middle = std::min(model.Selected(), rows.size() - shown + shown / 2);
  const size_t first = middle - std::min(middle, shown / 2);
  for (size_t i = first; i < std::min(first + shown, rows.size()); ++i) {
    char text[160];
    snprintf(text, sizeof(text), " %-14s %-7s%s %10llu", Enum2String(rows[i].category),
             LevelText(rows[i].level).c_str(), Rate(rows[i].recent).c_str(),
             static_cast<unsigned long long>(rows[i].lines));
    const int row = kRowsAbove + static_cast<int>(i - first);
    const chtype attribute = rows[i].level == LOG_LEVEL_NOTICE ? A_NORMAL : A_BOLD;
    if (i == model.Selected()) {
      DrawBar(row, text, attribute | A_REVERSE);
    } else {
      DrawLine(row, text, attribute);
    }
  }
}

std::string LogTitle(const TopModel& model) {
  std::string title = "-- log";
  if (!model.Only().empty()) title += " of " + model.Only();
  if (model.Held()) title += ", held";
  title += ' ';
  title.resize(std::max(title.size(), static_cast<size_t>(COLS)), '-');
  return title;
}

void DrawLog(const TopModel& model) {
  const int first = kRowsAbove + static_cast<int>(CategoryRows());
  DrawLine(first, LogTitle(model), A_BOLD);
  const auto room = static_cast<size_t>(LINES - first - 2);
  const std::vector<const TopModel::Line*> lines = model.LastLines(room);
  int row = first + 1;
  for (const TopModel::Line* line : lines) DrawLine(row++, line->text, AttributeOf(line->level));
}

void DrawHelp() {
  int row = 0;
  for (const char* line : kHelp) {
    if (row < LINES) DrawLine(row++, line, A_NORMAL);
  }
}

void DrawTooSmall() {
  char text[96];
  snprintf(text, sizeof(text), "too small: needs %dx%d", kLeastColumns, kLeastRows);
  DrawLine(0, text, A_NORMAL);
}

void DrawAll(const TopModel& model, const std::string& log) {
  DrawBar(0,
          " twlogctl top   " + FormatClock(Now()) + Rate(model.Total()) + "   " +
              EscapeControls(log, Backslash::kKept),
          A_REVERSE);
  DrawLine(1, " " + model.Note(), A_NORMAL);
  DrawLine(2, " category       level    lines/s      bytes/s      lines", A_BOLD);
  DrawCategories(model);
  DrawLog(model);
  DrawBar(LINES - 1, " ? help   q leave   Left/Right level   Up/Down category", A_REVERSE);
}

}  // namespace

void StartScreenColours() {
  if (!has_colors()) return;
  start_color();
  use_default_colors();
  init_pair(kSevere, COLOR_RED, -1);
  init_pair(kWarning, COLOR_YELLOW, -1);
  init_pair(kInformation, COLOR_CYAN, -1);
}

size_t CategoryRows() {
  const int rows = (LINES - kFixedRows) / 2;
  return static_cast<size_t>(std::clamp<int>(rows, 1, LOG_CATEG_COUNT));
}

void DrawTop(const TopModel& model, const std::string& log) {
  erase();
  if (LINES < kLeastRows || COLS < kLeastColumns) {
    DrawTooSmall();
  } else if (model.Help()) {
    DrawHelp();
  } else {
    DrawAll(model, log);
  }
  refresh();
}
