#include "tools/common/names.h"

#include <algorithm>
#include <charconv>

#include "tools/common/text.h"

namespace {

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
