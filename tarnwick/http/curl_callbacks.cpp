#include "tarnwick/http/curl_callbacks.h"

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <string>
#include <string_view>

namespace tarnwick {

namespace {

// Memory for the buffer and `more` bytes after it, or null. What an earlier failure has lost reads
// as zero bytes, so that no unset byte is ever parsed.
char* Grow(const CurlMemBuffer& buffer, size_t more) {
  if (more >= UINT_MAX - buffer.size) return nullptr;
  const size_t capacity = buffer.size + more + 1;
  if (buffer.data != nullptr) return static_cast<char*>(std::realloc(buffer.data, capacity));
  char* const fresh = static_cast<char*>(std::malloc(capacity));
  if (fresh != nullptr) std::memset(fresh, 0, buffer.size);
  return fresh;
}

bool ShouldWriteHeader(std::string_view line) {
  if (line == "\r\n") return true;
  return line.find(':') != std::string_view::npos &&
         line.find("Transfer-Encoding:") == std::string_view::npos;
}

}  // namespace

size_t CurlDiscardWrite(char* /*buffer*/, size_t size, size_t count, void* /*unused*/) {
  return size * count;
}

size_t CurlStringWrite(char* buffer, size_t size, size_t count, void* text) {
  // No exception may pass through libcurl.
  try {
    static_cast<std::string*>(text)->append(buffer, size * count);
  } catch (const std::exception&) {
    return 0;
  }
  return size * count;
}

size_t CurlFileWrite(char* buffer, size_t size, size_t count, void* file) {
  return std::fwrite(buffer, size, count, static_cast<FILE*>(file));
}

size_t CurlFileRead(char* buffer, size_t size, size_t count, void* file) {
  return std::fread(buffer, size, count, static_cast<FILE*>(file));
}

size_t CurlBufferWrite(char* buffer, size_t size, size_t count, void* memBuffer) {
  CurlMemBuffer* const target = static_cast<CurlMemBuffer*>(memBuffer);
  const size_t length = size * count;
  // After a failed realloc the old block is lost on purpose: what it holds is half a document, and
  // GetResponseXML must not find it.
  target->data = Grow(*target, length);
  if (target->data == nullptr) return length;
  std::memcpy(target->data + target->size, buffer, length);
  target->size += static_cast<unsigned int>(length);
  target->data[target->size] = '\0';
  return length;
}

size_t CurlHeaderToFile(char* buffer, size_t size, size_t count, void* file) {
  if (!ShouldWriteHeader(std::string_view(buffer, size * count))) return size * count;
  const size_t written = std::fwrite(buffer, size, count, static_cast<FILE*>(file));
  std::fflush(static_cast<FILE*>(file));
  return written;
}

}  // namespace tarnwick
