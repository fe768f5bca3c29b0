// A plot of characters.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_PLOT_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_PLOT_H_

#include <cstdint>
#include <map>
#include <string>
#include <vector>

// True when the locale's characters are UTF-8, and blocks can be shown.
// REQUIRES: setlocale was called.
bool MayDrawBlocks();

// Amounts per second over [begin, end), one value a column, `columns` at most: fewer when there
// are fewer seconds. A column holds the mean of its seconds.
std::vector<double> PlotColumns(const std::map<int64_t, uint64_t>& by_second, int64_t begin,
                                int64_t end, size_t columns);

// The rows of a plot, the highest first, scaled to the greatest value.
std::vector<std::string> PlotRows(const std::vector<double>& values, size_t rows, bool blocks);

// A bar of `width` characters that is filled by `part`, 0 to 1, without blanks after it.
std::string PlotBar(double part, size_t width, bool blocks);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_PLOT_H_
