// Spans of time and sizes, as people write and read them.
#ifndef TARNWICK_TOOLS_COMMON_UNITS_H_
#define TARNWICK_TOOLS_COMMON_UNITS_H_

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

// A span from "90", "90s", "10m", "1.5h", "2d" or "250ms"; without a unit, seconds. Nothing for a
// span of more than ten years.
std::optional<std::chrono::milliseconds> ParseSpan(std::string_view text);

// "250 ms", "12.5 s", "10 min", "3 h 20 min": the two largest units.
std::string FormatSpan(std::chrono::milliseconds span);

// "2.50 s" with so many decimals.
std::string FormatSeconds(double seconds, int decimals);

// "512 B", "1.2 KiB", "3.4 MiB".
std::string FormatBytes(double bytes);

#endif  // TARNWICK_TOOLS_COMMON_UNITS_H_
