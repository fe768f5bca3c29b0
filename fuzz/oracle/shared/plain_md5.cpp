#include "fuzz/oracle/shared/plain_md5.h"

#include <cmath>
#include <string>

namespace {

constexpr size_t kBlock = 64;

uint32_t WordAt(const std::string& text, size_t at) {
  uint32_t word = 0;
  for (size_t i = 0; i < 4; ++i) {
    word |= static_cast<uint32_t>(static_cast<unsigned char>(text[at + i])) << (8 * i);
  }
  return word;
}

void AppendBytes(std::string* text, uint64_t value, int count) {
  for (int i = 0; i < count; ++i) *text += static_cast<char>(value >> (8 * i) & 0xff);
}

struct Table {
  uint32_t sine[64];
  Table() {
    for (int i = 0; i < 64; ++i) {
      sine[i] = static_cast<uint32_t>(std::floor(std::fabs(std::sin(i + 1)) * 4294967296.0));
    }
  }
};

// The round's function of the three words, and the word of the block that step `i` takes.
uint32_t Mix(uint32_t i, uint32_t b, uint32_t c, uint32_t d, uint32_t* word) {
  switch (i / 16) {
    case 0:
      *word = i;
      return (b & c) | (~b & d);
    case 1:
      *word = (5 * i + 1) % 16;
      return (b & d) | (c & ~d);
    case 2:
      *word = (3 * i + 5) % 16;
      return b ^ c ^ d;
    default:
      *word = 7 * i % 16;
      return c ^ (b | ~d);
  }
}

void AddBlock(std::array<uint32_t, 4>* state, const std::string& block) {
  static const Table table;
  static const uint32_t shifts[4][4] = {
      {7, 12, 17, 22}, {5, 9, 14, 20}, {4, 11, 16, 23}, {6, 10, 15, 21}};
  auto [a, b, c, d] = *state;
  for (uint32_t i = 0; i < 64; ++i) {
    uint32_t word = 0;
    const uint32_t mixed = Mix(i, b, c, d, &word);
    const uint32_t sum = a + mixed + table.sine[i] + WordAt(block, 4 * word);
    const uint32_t shift = shifts[i / 16][i % 4];
    a = d;
    d = c;
    c = b;
    b += sum << shift | sum >> (32 - shift);
  }
  (*state)[0] += a;
  (*state)[1] += b;
  (*state)[2] += c;
  (*state)[3] += d;
}

}  // namespace

void PlainMd5::AddBlocks() {
  for (; waiting_.size() >= kBlock; waiting_.erase(0, kBlock)) {
    AddBlock(&state_, waiting_.substr(0, kBlock));
  }
}

void PlainMd5::Add(const std::string& text) {
  waiting_ += text;
  length_ += text.size();
  AddBlocks();
}

std::string PlainMd5::Finish() {
  waiting_ += '\x80';
  while (waiting_.size() % kBlock != kBlock - 8) waiting_ += '\0';
  AppendBytes(&waiting_, length_ * 8, 8);
  AddBlocks();
  std::string digest;
  for (const uint32_t word : state_) AppendBytes(&digest, word, 4);
  return HexOf(digest);
}

std::string Md5Of(const std::string& text) {
  PlainMd5 md5;
  md5.Add(text);
  return md5.Finish();
}

std::string HexOf(const std::string& bytes) {
  static const char kDigits[] = "0123456789abcdef";
  std::string hex;
  for (const char c : bytes) {
    hex += kDigits[static_cast<unsigned char>(c) / 16];
    hex += kDigits[static_cast<unsigned char>(c) % 16];
  }
  return hex;
}
