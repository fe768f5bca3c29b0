// The names of categories and levels, as people type them.
#ifndef TARNWICK_TOOLS_COMMON_NAMES_H_
#define TARNWICK_TOOLS_COMMON_NAMES_H_

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

#endif  // TARNWICK_TOOLS_COMMON_NAMES_H_
