#include "fuzz/oracle/encoding.h"

#include <algorithm>
#include <string_view>

namespace oracle {

namespace {

constexpr std::string_view kPlain =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_~()*,-.";
constexpr std::string_view kSpaces = " \t\n\v\f\r";
constexpr std::string_view kUpperHex = "0123456789ABCDEF";
constexpr std::string_view kLowerHex = "0123456789abcdef";
constexpr std::string_view kBase64 =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

bool Holds(std::string_view set, char c) {
  return set.find(c) != std::string_view::npos;
}

unsigned HexValue(char digit) {
  const size_t upper = kUpperHex.find(digit);
  return static_cast<unsigned>(std::min(upper, kLowerHex.find(digit)));
}

std::string TwoHexDigits(char byte, std::string_view digits) {
  const unsigned value = static_cast<unsigned char>(byte);
  return {digits[value / 16], digits[value % 16]};
}

std::string Padded(int64_t value, size_t width) {
  std::string text = Decimal(value);
  if (text.size() < width) text.insert(0, width - text.size(), '0');
  return text;
}

bool IsLeap(int64_t year) {
  return year % 4 == 0 && (year % 100 != 0 || year % 400 == 0);
}

// The date `days` after 1970-01-01, counted year by year and month by month.
std::string Date(int64_t days) {
  int64_t year = 1970;
  while (days >= (IsLeap(year) ? 366 : 365)) days -= IsLeap(year++) ? 366 : 365;
  const int lengths[] = {31, IsLeap(year) ? 29 : 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  int month = 0;
  while (days >= lengths[month]) days -= lengths[month++];
  return Padded(year, 4) + Padded(month + 1, 2) + Padded(days + 1, 2);
}

}  // namespace

std::string UrlEncoded(const std::string& text, const std::string& keep) {
  std::string out;
  for (const char c : text) {
    if (Holds(kSpaces, c)) {
      out += "%20";
    } else if (Holds(kPlain, c) || Holds(keep, c)) {
      out += c;
    } else {
      out += "%" + TwoHexDigits(c, kUpperHex);
    }
  }
  return out;
}

std::string UrlDecoded(const std::string& text) {
  std::string out;
  for (size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '%' || i + 2 >= text.size()) {
      out += text[i];
      continue;
    }
    out += static_cast<char>(HexValue(text[i + 1]) * 16 + HexValue(text[i + 2]));
    i += 2;
  }
  return out;
}

std::string WithBlanks(std::string text) {
  for (char& c : text) {
    if (Holds(kSpaces, c)) c = ' ';
  }
  return text;
}

// Walks the path once and knows at each byte in which part of the query it is. A name that no "="
// has ended yet is held back: when none comes, it is cut at the path's first zero byte.
std::string QueryEncoded(const std::string& path, const std::string& keep) {
  enum { kBeforeQuery, kName, kValue } part = kBeforeQuery;
  const size_t zero = std::min(path.find('\0'), path.size());
  std::string name;
  std::string out;
  size_t begin = 0;  // of the name, then of the value
  for (size_t i = 0; i < path.size(); ++i) {
    const char c = path[i];
    if (part == kBeforeQuery) {
      out += c;
      if (c == '?') part = kName, begin = i + 1;
    } else if (part == kName) {
      name += c;
      // The first byte of a name is never its "=".
      if (c != '=' || name.size() == 1) continue;
      out += name;
      part = kValue, begin = i + 1;
    } else if (c == '&') {
      if (begin >= zero) return out;
      part = kName, begin = i, name = c;
    } else {
      out += UrlEncoded(std::string(1, c), keep);
    }
  }
  if (part == kName && begin < zero) out += name.substr(0, zero - begin);
  return out;
}

std::string Base64(const std::string& text) {
  std::string bits;
  for (const char c : text) {
    for (int bit = 7; bit >= 0; --bit) bits += static_cast<unsigned char>(c) >> bit & 1 ? '1' : '0';
  }
  while (bits.size() % 6 != 0) bits += '0';
  std::string out;
  for (size_t at = 0; at < bits.size(); at += 6) {
    out += kBase64[std::stoul(bits.substr(at, 6), nullptr, 2)];
  }
  while (out.size() % 4 != 0) out += '=';
  return out;
}

std::string Base64Decoded(const std::string& text) {
  std::string out;
  unsigned bits = 0;
  int count = 0;
  for (const char c : text) {
    if (c == '=') break;
    bits = bits << 6 | static_cast<unsigned>(kBase64.find(c));
    count += 6;
    if (count < 8) continue;
    count -= 8;
    out += static_cast<char>(bits >> count & 0xff);
  }
  return out;
}

std::string Hex(const std::string& bytes) {
  std::string out;
  for (const char byte : bytes) out += TwoHexDigits(byte, kLowerHex);
  return out;
}

std::string HexDecoded(const std::string& text) {
  std::string out;
  for (size_t i = 0; i + 1 < text.size(); i += 2) {
    out += static_cast<char>(HexValue(text[i]) * 16 + HexValue(text[i + 1]));
  }
  return out;
}

std::string Trimmed(const std::string& text, const std::string& set) {
  std::string out = text;
  while (!out.empty() && Holds(set, out.front())) out.erase(0, 1);
  while (!out.empty() && Holds(set, out.back())) out.pop_back();
  return out;
}

std::string Without(const std::string& text, char ch) {
  std::string out;
  std::copy_if(text.begin(), text.end(), std::back_inserter(out), [ch](char c) { return c != ch; });
  return out;
}

std::string CopiedIntoBuffer(const std::string& source, size_t size, char filler) {
  std::string buffer(size, filler);
  for (size_t i = 0; i < size; ++i)
    buffer[i] = i + 1 < size && i < source.size() ? source[i] : '\0';
  return buffer;
}

std::string Decimal(int64_t value) {
  // The most negative number has no positive twin, so the digits are taken from the unsigned one.
  uint64_t rest = value < 0 ? 0 - static_cast<uint64_t>(value) : static_cast<uint64_t>(value);
  std::string out;
  do {
    out.insert(out.begin(), kUpperHex[rest % 10]);
    rest /= 10;
  } while (rest != 0);
  return value < 0 ? "-" + out : out;
}

std::string TimeStamp(int64_t microseconds) {
  const int64_t seconds = microseconds / 1000000;
  const int64_t day = seconds / 86400;
  const int64_t second = seconds % 86400;
  return Date(day) + "T" + Padded(second / 3600, 2) + Padded(second / 60 % 60, 2) +
         Padded(second % 60, 2) + "." + Padded(microseconds / 1000 % 1000, 3) + "Z";
}

}  // namespace oracle
