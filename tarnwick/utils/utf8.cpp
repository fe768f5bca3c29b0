#include "tarnwick/utils/utf8.h"

namespace tarnwick {

namespace {

struct LeadByte {
  unsigned char first;  // the range of lead bytes
  unsigned char last;
  size_t length;
  unsigned char secondMin;  // what the second byte may be, which bounds the character
  unsigned char secondMax;
};

constexpr LeadByte kLeadBytes[] = {
    {0xC2, 0xDF, 2, 0x80, 0xBF}, {0xE0, 0xE0, 3, 0xA0, 0xBF}, {0xE1, 0xEC, 3, 0x80, 0xBF},
    {0xED, 0xED, 3, 0x80, 0x9F}, {0xEE, 0xEF, 3, 0x80, 0xBF}, {0xF0, 0xF0, 4, 0x90, 0xBF},
    {0xF1, 0xF3, 4, 0x80, 0xBF}, {0xF4, 0xF4, 4, 0x80, 0x8F},
};

unsigned char ByteAt(std::string_view text, size_t index) {
  return static_cast<unsigned char>(text[index]);
}

bool RestFits(std::string_view text, const LeadByte& lead) {
  if (text.size() < lead.length) return false;
  if (ByteAt(text, 1) < lead.secondMin || ByteAt(text, 1) > lead.secondMax) return false;
  for (size_t i = 2; i < lead.length; ++i) {
    if ((ByteAt(text, i) & 0xC0) != 0x80) return false;
  }
  return true;
}

}  // namespace

size_t Utf8CharacterLength(std::string_view text) {
  if (text.empty()) return 0;
  const unsigned char first = ByteAt(text, 0);
  if (first < 0x80) return 1;
  for (const LeadByte& lead : kLeadBytes) {
    if (first >= lead.first && first <= lead.last) return RestFits(text, lead) ? lead.length : 0;
  }
  return 0;
}

}  // namespace tarnwick
