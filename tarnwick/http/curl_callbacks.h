// What libcurl calls during a transfer. All have libcurl's callback shape: a buffer of `count`
// items of `size` bytes, and the pointer that was set with the callback.
#ifndef TARNWICK_HTTP_CURL_CALLBACKS_H_
#define TARNWICK_HTTP_CURL_CALLBACKS_H_

#include <cstddef>

namespace tarnwick {

// A growing buffer. The client hands two of its own fields, laid out in the same way, to
// CurlBufferWrite.
struct CurlMemBuffer {
  char* data;         // from malloc, with a zero byte after the last one; null while empty
  unsigned int size;  // bytes, without that zero byte
};

// Drops the data.
size_t CurlDiscardWrite(char* buffer, size_t size, size_t count, void* unused);

// Appends to a std::string. Takes nothing, which ends the transfer, when there is no memory.
size_t CurlStringWrite(char* buffer, size_t size, size_t count, void* text);

// Writes to, or reads from, a FILE*. Results: the items that stdio has taken or given.
size_t CurlFileWrite(char* buffer, size_t size, size_t count, void* file);
size_t CurlFileRead(char* buffer, size_t size, size_t count, void* file);

// Appends to a CurlMemBuffer. Results: all bytes, also when there was no memory: the transfer goes
// on, and the buffer is then empty (null) with its old size.
size_t CurlBufferWrite(char* buffer, size_t size, size_t count, void* memBuffer);

// A header callback: writes the header lines and the empty line after them to a FILE*, without the
// status line and without Transfer-Encoding, because libcurl has decoded the body. A line is left
// out by its letters: a status line that holds a colon is written, and so is "transfer-encoding:".
size_t CurlHeaderToFile(char* buffer, size_t size, size_t count, void* file);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_CURL_CALLBACKS_H_
