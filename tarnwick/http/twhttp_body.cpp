// Reading a response's body, whole.
#define TW_LOG_SOURCE "twhttp"

#include <sys/mman.h>

#include <algorithm>
#include <cstdint>
#include <exception>
#include <memory>
#include <string_view>

#include "tarnwick/http/chunk_size.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/request_settings.h"
#include "tarnwick/net/socket_access.h"

using namespace tarnwick;

namespace {

constexpr int kPieceSize = 8192;
constexpr char kErrorText[] = "{\"error\":true}";

// Between these sizes a body grows to four times its length, where a string would double: that
// halves the number of reallocations, each of which costs a page fault per page. Pages that are
// only reserved cost nothing, so memory still grows with what arrives.
constexpr size_t kQuadrupleFrom = size_t{64} << 10;
constexpr size_t kQuadrupleUntil = size_t{32} << 20;

// From this size on large pages are asked for. Smaller bodies mostly lie where earlier ones lay,
// and cost no page fault.
constexpr size_t kHugePageMinimum = size_t{16} << 20;
constexpr size_t kLargePage = size_t{2} << 20;

// A large body costs more for its page faults than for its bytes, and large pages spare nearly all
// of them. Still only those take memory that bytes arrive in. Where the kernel has no large pages
// the call fails, and all is as it was. REQUIRES: `body` is empty, so that no page is there yet.
void AskForLargePages(std::string* body) {
  void* begin = &(*body)[0];
  size_t size = body->capacity();
  if (size < kHugePageMinimum || std::align(kLargePage, 1, begin, size) == nullptr) return;
  madvise(begin, size, MADV_HUGEPAGE);
}

// Makes room for `more` bytes, and in a large body for what will follow them.
void MakeRoom(size_t more, std::string* body) try {
  const size_t size = body->size() + more;
  if (size <= body->capacity() || size < kQuadrupleFrom) return;
  std::string larger;
  larger.reserve(size <= kQuadrupleUntil ? 4 * size : 2 * size);
  AskForLargePages(&larger);
  larger.append(*body);
  body->swap(larger);
} catch (const std::exception&) {
  // There is less memory than that; the string itself will ask for what it needs.
}

void Append(std::string_view bytes, std::string* body) {
  MakeRoom(bytes.size(), body);
  body->append(bytes);
}

// The chunks that are buffered whole, with nothing to wait for.
void AppendBufferedChunks(TWSocket* socket, std::string* body) {
  std::string_view buffered = SocketAccess::Buffered(socket);
  MakeRoom(buffered.size(), body);
  for (;;) {
    const std::string_view data = FirstCompleteChunk(buffered);
    if (data.empty()) return;
    const size_t size = static_cast<size_t>(data.data() - buffered.data()) + data.size() + 2;
    SocketAccess::Take(socket, size);
    buffered.remove_prefix(size);
    body->append(data);
  }
}

// Reads `len` bytes at most and adds what came to the body. Results: those of ReadData.
// REQUIRES: len <= kPieceSize.
int AppendRead(TWSocket* socket, int len, std::string* body) {
  const auto size = static_cast<size_t>(len);
  const std::string_view buffered = SocketAccess::Buffered(socket);
  if (buffered.size() >= size) {
    SocketAccess::Take(socket, size);
    Append(buffered.substr(0, size), body);
    return len;
  }
  char piece[kPieceSize];
  const int count = socket->ReadData(piece, len);
  if (count > 0) Append({piece, static_cast<size_t>(count)}, body);
  return count;
}

bool ReadChunk(TWSocket* socket, uint32_t size, std::string* body) {
  while (size > 0) {
    const int count =
        AppendRead(socket, static_cast<int>(std::min<uint32_t>(size, kPieceSize)), body);
    if (count < 0) return false;
    size -= static_cast<uint32_t>(count);
    if (socket->IsEOF()) return true;
  }
  return true;
}

// The two bytes after a chunk, whatever they are. Direct reading delivers what has arrived, so one
// may be missing; through the buffer one is missing where the stream ends or a read failed, and
// another read would wait once more.
void SkipChunkCrlf(TWSocket* socket) {
  char ending[2];
  const int count = socket->ReadData(ending, 2);
  if (count == 1 && !SocketAccess::IsBuffered(socket)) socket->ReadData(ending, 1);
}

// A size line that cannot be read is taken for the last chunk, and trailers stay unread.
bool ReadChunks(TWSocket* socket, std::string* body) {
  for (;;) {
    AppendBufferedChunks(socket, body);
    char line[kPieceSize];
    const int length = socket->ReadToLineEnd(line, kPieceSize);
    const uint32_t size = length < 1 ? 0 : ParseChunkSize({line, static_cast<size_t>(length)});
    if (size == 0) return true;
    if (!ReadChunk(socket, size, body)) return false;
    SkipChunkCrlf(socket);
  }
}

// The announced length is ignored: the body ends where the server closes.
bool ReadUntilClose(TWSocket* socket, std::string* body) {
  for (;;) {
    const int count = AppendRead(socket, kPieceSize, body);
    if (count <= 0) return count == 0;
  }
}

}  // namespace

std::string TWHttpClient::GetResp() try {
  m_connState = 1;
  m_result = CheckHttpResponse();
  if (m_result != HTTP_RET_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Http Resp error\n");
    return kErrorText;
  }
  std::string body;
  if (ReadBodyFor(__func__, &body) != HTTP_RET_OK) body = kErrorText;
  return body;
} catch (const std::exception&) {  // memory ran out
  return kErrorText;
}

int TWHttpClient::ReadBody(std::string& body) try {
  body.clear();
  return ReadBodyFor(__func__, &body);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::ReadBodyFor(const char* operation, std::string* body) {
  // Only the exact word: a server that writes it otherwise gets its chunk lines handed through.
  const bool chunked = m_strTransferEncoding == "chunked";
  const bool hasHead = m_connState == 2 && m_pSocket != nullptr;
  if (!hasHead || !(chunked ? ReadChunks(m_pSocket, body) : ReadUntilClose(m_pSocket, body))) {
    TW_LOG_AS(operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Read data error\n");
    return HTTP_RET_IO_ERROR;
  }
  TW_LOG_AS(operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG2, "strRet = %s\n",
            tarnwick::PeerText(body->c_str()).Get());
  return HTTP_RET_OK;
}
