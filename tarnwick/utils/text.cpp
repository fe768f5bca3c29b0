// Removing, trimming and copying characters; numbers and times as text.
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <string>

#include "tarnwick/platform/text_view.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

// Moves what is between two of them at once: responses of megabytes have lines of some dozen
// bytes.
void RemoveChar(std::string& text, char ch) {
  char* out = &text[0];
  const char* in = out;
  for (const char* const end = in + text.size(); in < end;) {
    const size_t left = static_cast<size_t>(end - in);
    const void* const found = std::memchr(in, ch, left);
    const size_t size =
        found != nullptr ? static_cast<size_t>(static_cast<const char*>(found) - in) : left;
    if (out != in) std::memmove(out, in, size);
    out += size;
    in += size + 1;
  }
  text.resize(static_cast<size_t>(out - text.data()));
}

std::string TrimString(std::string text, const char* set) {
  return set != nullptr ? std::string(Trim(text, set)) : text;
}

char* StrNCopy(char* dest, const char* src, size_t size) {
  if (size == 0 || dest == nullptr || src == nullptr) return dest;
  std::strncpy(dest, src, size - 1);
  dest[size - 1] = '\0';
  return dest;
}

std::string IntToString(int64_t value) {
  return std::to_string(value);
}

std::string FormatUtcTimeStamp(int64_t microseconds) {
  const time_t seconds = static_cast<time_t>(microseconds / 1000000);
  struct tm utc = {};
  char date[64] = "";
  if (gmtime_r(&seconds, &utc) != nullptr) strftime(date, sizeof(date), "%Y%m%dT%H%M%S", &utc);
  char milliseconds[64];
  snprintf(milliseconds, sizeof(milliseconds), ".%03lldZ",
           static_cast<long long>(microseconds / 1000 % 1000));
  return std::string(date) + milliseconds;
}
