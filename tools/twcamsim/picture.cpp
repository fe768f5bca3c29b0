#include "tools/twcamsim/picture.h"

#include <cstdint>
#include <cstdlib>

namespace {

// Collects bits, the highest first; a byte of ones is followed by a zero byte, as JPEG wants it.
class BitWriter {
 public:
  void Write(unsigned bits, int count) {
    while (count-- > 0) {
      byte_ = (byte_ << 1) | ((bits >> count) & 1);
      if (++filled_ == 8) Flush();
    }
  }

  std::string Finish() {
    while (filled_ != 0) Write(1, 1);
    return bytes_;
  }

 private:
  void Flush() {
    bytes_ += static_cast<char>(byte_);
    if ((byte_ & 0xff) == 0xff) bytes_ += '\0';
    byte_ = 0;
    filled_ = 0;
  }

  std::string bytes_;
  unsigned byte_ = 0;
  int filled_ = 0;
};

std::string Segment(unsigned char marker, const std::string& content) {
  const size_t size = content.size() + 2;
  std::string bytes = "\xff";
  bytes += static_cast<char>(marker);
  bytes += static_cast<char>(size >> 8);
  bytes += static_cast<char>(size & 0xff);
  return bytes + content;
}

// Every step of brightness is one of the quantised DC value: the table holds 8 throughout.
std::string Quantisation() {
  return Segment(0xdb, '\0' + std::string(64, '\x08'));
}

std::string Frame(int width, int height) {
  std::string content = "\x08";  // bits a sample
  for (const int side : {height, width}) {
    content += static_cast<char>(side >> 8);
    content += static_cast<char>(side & 0xff);
  }
  return Segment(0xc0, content + std::string("\x01\x01\x11\x00", 4));
}

// Codes of 4 bits for the sizes 0 to 8 of a DC difference, and one of 1 bit for "no more": the
// squares have no AC parts.
std::string HuffmanTables() {
  const std::string dc_counts("\0\0\0\x09\0\0\0\0\0\0\0\0\0\0\0\0", 16);
  const std::string dc("\0\x01\x02\x03\x04\x05\x06\x07\x08", 9);
  const std::string ac_counts("\x01\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0", 16);
  return Segment(0xc4, std::string(1, '\0') + dc_counts + dc) +
         Segment(0xc4, std::string(1, '\x10') + ac_counts + std::string(1, '\0'));
}

void WriteDifference(int difference, BitWriter* bits) {
  int size = 0;
  while ((std::abs(difference) >> size) != 0) ++size;
  bits->Write(static_cast<unsigned>(size), 4);
  const int coded = difference < 0 ? difference + (1 << size) - 1 : difference;
  bits->Write(static_cast<unsigned>(coded), size);
  bits->Write(0, 1);
}

std::string Squares(int columns, int rows, int frame) {
  BitWriter bits;
  int before = 0;
  for (int row = 0; row < rows; ++row) {
    for (int column = 0; column < columns; ++column) {
      const bool bar = column == frame % columns;
      const int level = bar ? 100 : row * 128 / rows - 90;
      WriteDifference(level - before, &bits);
      before = level;
    }
  }
  return bits.Finish();
}

}  // namespace

std::string TestPicture(int columns, int rows, int frame) {
  return "\xff\xd8" + Quantisation() + Frame(columns * 8, rows * 8) + HuffmanTables() +
         Segment(0xda, std::string("\x01\x01\x00\x00\x3f\x00", 6)) + Squares(columns, rows, frame) +
         "\xff\xd9";
}
