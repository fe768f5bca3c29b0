// Removing, trimming and copying characters.
#include <algorithm>
#include <cstring>

#include "tarnwick/utils/utils.h"

void RemoveChar(std::string& text, char ch) {
  text.erase(std::remove(text.begin(), text.end(), ch), text.end());
}

std::string TrimString(std::string text, const char* set) {
  if (set == nullptr) return text;
  const size_t first = text.find_first_not_of(set);
  if (first == std::string::npos) return std::string();
  return text.substr(first, text.find_last_not_of(set) - first + 1);
}

char* StrNCopy(char* dest, const char* src, size_t size) {
  if (size == 0 || dest == nullptr || src == nullptr) return dest;
  std::strncpy(dest, src, size - 1);
  dest[size - 1] = '\0';
  return dest;
}
