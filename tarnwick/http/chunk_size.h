// The size line of a chunk (RFC 7230, section 4.1), as text.
#ifndef TARNWICK_HTTP_CHUNK_SIZE_H_
#define TARNWICK_HTTP_CHUNK_SIZE_H_

#include <cstdint>
#include <string_view>

// The leading hexadecimal digits of `line` as a number of 32 bits; higher bits are lost. 0 when
// there are none. What follows them, a chunk extension for example, does not count.
uint32_t ParseChunkSize(std::string_view line);

#endif  // TARNWICK_HTTP_CHUNK_SIZE_H_
