#include "tools/twlogctl/log_plot.h"

#include <langinfo.h>

#include <algorithm>
#include <cmath>
#include <cstring>

namespace {

// From nothing to a full character.
const std::vector<std::string>& Heights(bool blocks) {
  static const std::vector<std::string> unicode = {" ", "▁", "▂", "▃", "▄", "▅", "▆", "▇", "█"};
  static const std::vector<std::string> ascii = {" ", ".", ":", "#"};
  return blocks ? unicode : ascii;
}

// The part of a character at height `row`, counted from the bottom, that a value of `filled`
// characters fills.
size_t StepOf(double filled, size_t row, size_t steps) {
  const double inside = std::clamp(filled - static_cast<double>(row), 0.0, 1.0);
  return static_cast<size_t>(std::lround(inside * static_cast<double>(steps)));
}

}  // namespace

bool MayDrawBlocks() {
  return std::strcmp(nl_langinfo(CODESET), "UTF-8") == 0;
}

std::vector<double> PlotColumns(const std::map<int64_t, uint64_t>& by_second, int64_t begin,
                                int64_t end, size_t columns) {
  const auto seconds = static_cast<size_t>(std::max<int64_t>(end - begin, 1));
  const size_t per_column = (seconds + columns - 1) / columns;
  std::vector<double> values((seconds + per_column - 1) / per_column);
  for (auto entry = by_second.lower_bound(begin); entry != by_second.end() && entry->first < end;
       ++entry) {
    const size_t column = static_cast<size_t>(entry->first - begin) / per_column;
    // The last column may be of fewer seconds.
    const size_t width = std::min(per_column, seconds - column * per_column);
    values[column] += static_cast<double>(entry->second) / static_cast<double>(width);
  }
  return values;
}

std::vector<std::string> PlotRows(const std::vector<double>& values, size_t rows, bool blocks) {
  const std::vector<std::string>& heights = Heights(blocks);
  const double most = *std::max_element(values.begin(), values.end());
  std::vector<std::string> lines(rows);
  for (size_t row = 0; row < rows; ++row) {
    for (const double value : values) {
      const double filled = most > 0 ? value / most * static_cast<double>(rows) : 0;
      size_t step = StepOf(filled, row, heights.size() - 1);
      if (row == 0 && value > 0) step = std::max<size_t>(step, 1);  // little is not nothing
      lines[rows - 1 - row] += heights[step];
    }
  }
  return lines;
}

std::string PlotBar(double part, size_t width, bool blocks) {
  const auto filled = static_cast<size_t>(std::lround(part * static_cast<double>(width)));
  std::string bar;
  for (size_t i = 0; i < filled; ++i) bar += Heights(blocks).back();
  return bar;
}
