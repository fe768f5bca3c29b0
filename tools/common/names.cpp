#include "tools/common/names.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <utility>

namespace {

constexpr size_t kNearestCount = 3;

std::string LowerCase(std::string_view text) {
  std::string result(text);
  for (char& letter : result) {
    if (letter >= 'A' && letter <= 'Z') letter = static_cast<char>(letter - 'A' + 'a');
  }
  return result;
}

std::optional<int> ParseNumberBelow(std::string_view text, int count) {
  int number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  if (number < 0 || number >= count) return std::nullopt;
  return number;
}

std::optional<int> ParseNameOrNumber(std::string_view text, const std::vector<std::string>& names) {
  const auto found = std::find(names.begin(), names.end(), LowerCase(text));
  if (found != names.end()) return static_cast<int>(found - names.begin());
  return ParseNumberBelow(text, static_cast<int>(names.size()));
}

template <typename T>
std::vector<std::string> NamesBelow(int count) {
  std::vector<std::string> names;
  names.reserve(static_cast<size_t>(count));
  for (int value = 0; value < count; ++value) names.push_back(Enum2String(static_cast<T>(value)));
  return names;
}

// Insertions, deletions, replacements and swaps of neighbours: "htpt" is one mistake away from
// "http".
size_t EditDistance(std::string_view a, std::string_view b) {
  std::vector<std::vector<size_t>> cost(a.size() + 1, std::vector<size_t>(b.size() + 1));
  for (size_t i = 0; i <= a.size(); ++i) {
    for (size_t j = 0; j <= b.size(); ++j) {
      if (i == 0 || j == 0) {
        cost[i][j] = i + j;
        continue;
      }
      const size_t replaced = cost[i - 1][j - 1] + (a[i - 1] == b[j - 1] ? 0 : 1);
      cost[i][j] = std::min({cost[i - 1][j] + 1, cost[i][j - 1] + 1, replaced});
      if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1]) {
        cost[i][j] = std::min(cost[i][j], cost[i - 2][j - 2] + 1);
      }
    }
  }
  return cost[a.size()][b.size()];
}

std::optional<double> UnitInMilliseconds(std::string_view unit) {
  constexpr std::pair<std::string_view, double> kUnits[] = {
      {"ms", 1},      {"", 1000},     {"s", 1000},     {"m", 60000},
      {"min", 60000}, {"h", 3600000}, {"d", 86400000},
  };
  for (const auto& [name, milliseconds] : kUnits) {
    if (unit == name) return milliseconds;
  }
  return std::nullopt;
}

// "3 h 20 min", or "3 h" without a second part.
std::string TwoUnits(long long large, const char* largeUnit, long long small,
                     const char* smallUnit) {
  std::string text = std::to_string(large) + ' ' + largeUnit;
  if (small > 0) text += ' ' + std::to_string(small) + ' ' + smallUnit;
  return text;
}

}  // namespace

std::optional<LOG_CATEG> ParseCategory(std::string_view text) {
  const std::optional<int> value = ParseNameOrNumber(text, CategoryNames());
  if (!value) return std::nullopt;
  return static_cast<LOG_CATEG>(*value);
}

std::optional<LOG_LEVEL> ParseLevel(std::string_view text) {
  const std::optional<int> value = ParseNameOrNumber(text, LevelNames());
  if (!value) return std::nullopt;
  return static_cast<LOG_LEVEL>(*value);
}

std::vector<std::string> CategoryNames() {
  return NamesBelow<LOG_CATEG>(LOG_CATEG_COUNT);
}

std::vector<std::string> LevelNames() {
  return NamesBelow<LOG_LEVEL>(LOG_LEVEL_DEBUG3 + 1);
}

std::vector<std::string> NearestNames(std::string_view text,
                                      const std::vector<std::string>& names) {
  const std::string typed = LowerCase(text.substr(0, 64));  // nothing longer is near a name
  std::vector<std::pair<size_t, std::string>> ranked;
  for (const std::string& name : names) {
    const size_t distance = EditDistance(typed, name);
    if (distance * 2 <= std::max(typed.size(), name.size())) ranked.emplace_back(distance, name);
  }
  std::stable_sort(ranked.begin(), ranked.end(),
                   [](const auto& a, const auto& b) { return a.first < b.first; });
  std::vector<std::string> nearest;
  for (const auto& [distance, name] : ranked) {
    // Beside a name that is one letter away, one that is three away is not what was meant.
    const bool isNear = distance <= ranked.front().first + 1;
    if (isNear && nearest.size() < kNearestCount) nearest.push_back(name);
  }
  return nearest;
}

std::optional<std::chrono::milliseconds> ParseSpan(std::string_view text) {
  double number = 0;
  const auto [end, error] =
      std::from_chars(text.data(), text.data() + text.size(), number, std::chars_format::fixed);
  if (error != std::errc() || !std::isfinite(number) || std::signbit(number)) return std::nullopt;
  const auto unit = UnitInMilliseconds(text.substr(static_cast<size_t>(end - text.data())));
  // Ten years: what is longer is a mistake, and clocks of 32 bits cannot add it.
  constexpr double kLongest = 10.0 * 366 * 86400 * 1000;
  if (!unit || number * *unit > kLongest) return std::nullopt;
  return std::chrono::milliseconds(std::llround(number * *unit));
}

std::string FormatSpan(std::chrono::milliseconds span) {
  const long long total = span.count();
  if (total < 0) return "-" + FormatSpan(-span);
  const long long seconds = total / 1000;
  if (seconds == 0) return std::to_string(total) + " ms";
  if (seconds < 60) {
    const long long tenths = total % 1000 / 100;
    return std::to_string(seconds) + (tenths > 0 ? "." + std::to_string(tenths) : "") + " s";
  }
  if (seconds < 3600) return TwoUnits(seconds / 60, "min", seconds % 60, "s");
  if (seconds < 86400) return TwoUnits(seconds / 3600, "h", seconds % 3600 / 60, "min");
  return TwoUnits(seconds / 86400, "d", seconds % 86400 / 3600, "h");
}

std::string FormatBytes(double bytes) {
  constexpr const char* kUnits[] = {"B", "KiB", "MiB", "GiB", "TiB"};
  size_t unit = 0;
  while (bytes >= 1023.95 && unit + 1 < sizeof(kUnits) / sizeof(kUnits[0])) {
    bytes /= 1024;
    ++unit;
  }
  char text[64];
  snprintf(text, sizeof(text), unit == 0 ? "%.0f %s" : "%.1f %s", bytes, kUnits[unit]);
  return text;
}
