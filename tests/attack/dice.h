// The random choices of the attacks: the same seed and number give the same ones.
#ifndef TARNWICK_TESTS_ATTACK_DICE_H_
#define TARNWICK_TESTS_ATTACK_DICE_H_

#include <cstddef>
#include <cstdint>
#include <string>

class Dice {
 public:
  Dice(uint64_t seed, uint64_t number) : state_(seed * 0x9e3779b97f4a7c15 ^ number) {
    Next();
    state_ ^= number << 32;
  }

  // SplitMix64, whose every state is a good one.
  uint64_t Next() {
    state_ += 0x9e3779b97f4a7c15;
    uint64_t value = state_;
    value = (value ^ (value >> 30)) * 0xbf58476d1ce4e5b9;
    value = (value ^ (value >> 27)) * 0x94d049bb133111eb;
    return value ^ (value >> 31);
  }

  // From 0 to limit - 1. REQUIRES: limit is positive.
  size_t Below(size_t limit) { return static_cast<size_t>(Next() % limit); }

  // From `least` to `most`.
  size_t Between(size_t least, size_t most) { return least + Below(most - least + 1); }

  bool PerCent(size_t share) { return Below(100) < share; }
  bool OneIn(size_t count) { return Below(count) == 0; }

  template <typename T, size_t kSize>
  const T& Pick(const T (&table)[kSize]) {
    return table[Below(kSize)];
  }

  // Any bytes; letters alone.
  std::string Bytes(size_t count) {
    std::string bytes(count, '\0');
    for (char& byte : bytes) byte = static_cast<char>(Next() >> 56);
    return bytes;
  }
  std::string Letters(size_t count) {
    std::string letters(count, '\0');
    for (char& letter : letters) letter = static_cast<char>('a' + Below(26));
    return letters;
  }

 private:
  uint64_t state_;
};

#endif  // TARNWICK_TESTS_ATTACK_DICE_H_
