// MD5 (RFC 1321), written for clarity.
#ifndef TARNWICK_FUZZ_ORACLE_SHARED_PLAIN_MD5_H_
#define TARNWICK_FUZZ_ORACLE_SHARED_PLAIN_MD5_H_

#include <array>
#include <cstdint>
#include <string>

class PlainMd5 {
 public:
  void Add(const std::string& text);

  // The digest in lower-case hex. More may be added afterwards: it goes on from the state after
  // the padding, with the length counted without it.
  std::string Finish();

 private:
  void AddBlocks();

  std::array<uint32_t, 4> state_ = {0x67452301, 0xefcdab89, 0x98badcfe, 0x10325476};
  std::string waiting_;  // less than a block
  uint64_t length_ = 0;  // bytes
};

std::string Md5Of(const std::string& text);

std::string HexOf(const std::string& bytes);

#endif  // TARNWICK_FUZZ_ORACLE_SHARED_PLAIN_MD5_H_
