// The size line of a chunk (RFC 7230, section 4.1), and whole chunks, as text.
#ifndef TARNWICK_HTTP_CHUNK_SIZE_H_
#define TARNWICK_HTTP_CHUNK_SIZE_H_

#include <cstdint>
#include <string_view>

namespace tarnwick {

// The leading hexadecimal digits of `line` as a number of 32 bits; higher bits are lost. 0 when
// there are none. What follows them, a chunk extension for example, is ignored.
uint32_t ParseChunkSize(std::string_view line);

// The data of the chunk with which `bytes` begins, when it is there with its size line and the two
// bytes after it, whatever these are. Empty otherwise, for the last chunk, and where the line is
// long: then it is read as any other line, which cuts it.
std::string_view FirstCompleteChunk(std::string_view bytes);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_CHUNK_SIZE_H_
