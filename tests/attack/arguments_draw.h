// Arguments that nobody expects, drawn in an order that the seed fixes.
#ifndef TARNWICK_TESTS_ATTACK_ARGUMENTS_DRAW_H_
#define TARNWICK_TESTS_ATTACK_ARGUMENTS_DRAW_H_

#include <cstdint>
#include <deque>
#include <random>
#include <string>

class Draw {
 public:
  explicit Draw(uint64_t seed) : engine_(seed) {}
  Draw(const Draw&) = delete;
  Draw& operator=(const Draw&) = delete;

  // From 0 to `count` - 1.
  unsigned Below(unsigned count) { return static_cast<unsigned>(engine_() % count); }
  // True once in `count` calls.
  bool OneIn(unsigned count) { return Below(count) == 0; }
  bool Bool() { return OneIn(2); }

  // The string lives as long as the object: empty, line ends, conversions, NUL, bad UTF-8, markup,
  // 70,000 bytes, random bytes, two of these in a row, and ordinary ones.
  const std::string& Text();
  // The same up to its first NUL; one call in eight returns null where OrNull says so.
  const char* CText() { return Text().c_str(); }
  const char* CTextOrNull() { return OneIn(8) ? nullptr : CText(); }

  // Limits, their neighbours, powers of two, small numbers.
  int Int();
  unsigned Unsigned() { return static_cast<unsigned>(Int()); }
  int64_t Long();

  // From 0 to 70,000: the size of a buffer that is there.
  unsigned Size();

  // A time limit in seconds, as the calls take it: most often 0 or less, or no limit at all, which
  // the peers allow because they close.
  int Seconds();

 private:
  std::string NewText();

  std::mt19937_64 engine_;
  std::deque<std::string> texts_;
};

#endif  // TARNWICK_TESTS_ATTACK_ARGUMENTS_DRAW_H_
