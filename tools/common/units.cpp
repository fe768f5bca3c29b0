#include "tools/common/units.h"

#include <charconv>
#include <cmath>
#include <cstdio>
#include <utility>

namespace {

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
std::string TwoUnits(long long large, const char* large_unit, long long small,
                     const char* small_unit) {
  std::string text = std::to_string(large) + ' ' + large_unit;
  if (small > 0) text += ' ' + std::to_string(small) + ' ' + small_unit;
  return text;
}

}  // namespace

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

std::string FormatSeconds(double seconds, int decimals) {
  char text[64];
  snprintf(text, sizeof(text), "%.*f s", decimals, seconds);
  return text;
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
