// Plain second implementations of the text helpers and encodings, with decoders for the way back.
#ifndef TARNWICK_FUZZ_ORACLE_ENCODING_H_
#define TARNWICK_FUZZ_ORACLE_ENCODING_H_

#include <cstdint>
#include <string>
#include <vector>

namespace oracle {

std::string UrlEncoded(const std::string& text, const std::string& keep);
std::string UrlDecoded(const std::string& text);

// `text` with a blank for each white space, which is all that the encoding loses.
std::string WithBlanks(std::string text);

// REQUIRES: no zero byte in `path`.
std::string QueryEncoded(const std::string& path, const std::string& keep);

std::string Base64(const std::string& text);
std::string Base64Decoded(const std::string& text);

std::string Hex(const std::string& bytes);
std::string HexDecoded(const std::string& text);

std::string Trimmed(const std::string& text, const std::string& set);
std::string Without(const std::string& text, char ch);

// A buffer of `size` bytes, filled with `filler` before the copy.
std::string CopiedIntoBuffer(const std::string& source, size_t size, char filler);

std::string Decimal(int64_t value);

// REQUIRES: a time between the years 1970 and 9999.
std::string TimeStamp(int64_t microseconds);

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_ENCODING_H_
