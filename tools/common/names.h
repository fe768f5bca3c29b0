// Names and amounts that people type.
#ifndef TARNWICK_TOOLS_COMMON_NAMES_H_
#define TARNWICK_TOOLS_COMMON_NAMES_H_

#include <chrono>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tarnwick/log/twdebuglog.h"

// A category or a level from its name, in any case, or its number.
std::optional<LOG_CATEG> ParseCategory(std::string_view text);
std::optional<LOG_LEVEL> ParseLevel(std::string_view text);

// All names, in the order of their numbers.
std::vector<std::string> CategoryNames();
std::vector<std::string> LevelNames();

// The three names at most that differ least from `text` (edit distance), the nearest first; none
// when all of them differ by more than half of their letters. Those that
// differ by two letters more than the nearest are left out.
std::vector<std::string> NearestNames(std::string_view text, const std::vector<std::string>& names);

// A span from "90", "90s", "10m", "1.5h", "2d" or "250ms"; without a unit, seconds. Nothing for a
// span of more than ten years.
std::optional<std::chrono::milliseconds> ParseSpan(std::string_view text);

// "250 ms", "12.5 s", "10 min", "3 h 20 min": the two largest units.
std::string FormatSpan(std::chrono::milliseconds span);

// "512 B", "1.2 KiB", "3.4 MiB".
std::string FormatBytes(double bytes);

#endif  // TARNWICK_TOOLS_COMMON_NAMES_H_
