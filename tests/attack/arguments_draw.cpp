#include "tests/attack/arguments_draw.h"

#include <climits>
#include <iterator>

namespace {

constexpr size_t kLong = 70000;

// A literal with the NULs that it holds.
template <size_t kSize>
std::string Whole(const char (&text)[kSize]) {
  return std::string(text, kSize - 1);
}

const std::string& Odd(unsigned number) {
  static const std::string texts[] = {
      "",
      "\r\n",
      "a\r\nInjected: yes\r\n\r\nGET / HTTP/1.1\r\n",
      "\n",
      "%",
      "%s%n%s%n",
      "%99999999d",
      "%zz%0g%",
      Whole("\0"),
      Whole("before\0after"),
      "\xff\xfe\xc0\xaf\xed\xa0\x80",
      "\xf4\x90\x80\x80 \xe2\x80",
      "\x1b[2J\x1b]0;title\a",
      std::string(kLong, 'a'),
      std::string(kLong, '\n'),
      std::string(kLong, '"'),
      std::string(2047, 'b'),
      std::string(4096, '/'),
      " \t \v\f",
      "=",
      "\"",
      "\\",
      "?&=&&==#",
      "////",
      "a?b=c d&e=\"f\"&g",
      "<?xml version=\"1.0\"?><a>",
      "<!DOCTYPE a [<!ENTITY b \"c\">]><a>&b;&b;</a>",
      "{\"success\":true}",
      "[[[[[[[[[[[[[[[[[[[[",
      "-1",
      "99999999999999999999",
      "Digest realm=\"a, nonce=b, qop=\"auth,auth-int\"",
      "Basic",
      "user:pass@host",
      "[::1]",
      "0x7f.1",
  };
  return texts[number % std::size(texts)];
}

const std::string& Ordinary(unsigned number) {
  static const std::string texts[] = {
      "info.json?full=1&name=a b", "admin", "secret", "name=value", "<a><b>c</b></a>", "id=1234",
      "1,2,3,4,5,6,7,8",           "?",     "path",   "text",
  };
  return texts[number % std::size(texts)];
}

}  // namespace

std::string Draw::NewText() {
  switch (Below(8)) {
    case 0:
    case 1:
      return Ordinary(Below(1000));
    case 2: {
      std::string bytes(Below(300), '\0');
      for (char& byte : bytes) byte = static_cast<char>(engine_());
      return bytes;
    }
    case 3:
      return Odd(Below(1000)) + Ordinary(Below(1000)) + Odd(Below(1000));
    default:
      return Odd(Below(1000));
  }
}

const std::string& Draw::Text() {
  texts_.push_back(NewText());
  return texts_.back();
}

int Draw::Int() {
  constexpr int kInts[] = {
      0,     -1,      1,       2,          3,       5,           7,       8,          73,    74,
      75,    80,      99,      255,        256,     4096,        -5,      -255,       65535, 65536,
      65537, 1000000, 1 << 30, -(1 << 30), INT_MAX, INT_MAX - 1, INT_MIN, INT_MIN + 1};
  if (OneIn(8)) return static_cast<int>(static_cast<uint32_t>(engine_()));
  return kInts[Below(std::size(kInts))];
}

int64_t Draw::Long() {
  constexpr int64_t kLongs[] = {INT64_MIN, INT64_MIN + 1, INT64_MAX,        INT64_MAX - 1,
                                -1,        -999999,       INT64_C(1) << 62, -(INT64_C(1) << 62)};
  if (OneIn(4)) return static_cast<int64_t>(engine_());
  if (Bool()) return Int();
  return kLongs[Below(std::size(kLongs))];
}

unsigned Draw::Size() {
  constexpr unsigned kSizes[] = {0, 1, 2, 3, 16, 1023, 1024, 1025, 2047, 4096, 65535, 65536, 70000};
  return Bool() ? kSizes[Below(std::size(kSizes))] : Below(300);
}

int Draw::Seconds() {
  constexpr int kSeconds[] = {0, 0, 0, 1, 2, 5, -1, -5, INT_MIN, INT_MAX, 1000000000, 2147484};
  return kSeconds[Below(std::size(kSeconds))];
}
