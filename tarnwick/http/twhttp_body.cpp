// Reading a response's body, whole.
#define TW_LOG_SOURCE "twhttp"

#include <algorithm>
#include <cstdint>
#include <exception>

#include "tarnwick/http/chunk_size.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"

namespace {

constexpr int kPieceSize = 8192;
constexpr char kErrorText[] = "{\"error\":true}";

}  // namespace

std::string TWHttpClient::GetResp() try {
  m_connState = 1;
  if (CheckHttpResponse() != HTTP_RET_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Http Resp error\n");
    return kErrorText;
  }
  std::string body;
  return ReadBodyFor(__func__, &body) == HTTP_RET_OK ? body : kErrorText;
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
  const bool complete = m_connState == 2 && (chunked ? ReadChunks(body) : ReadToEnd(body));
  if (!complete) {
    TW_LOG_AS(operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Read data error\n");
    return HTTP_RET_IO_ERROR;
  }
  TW_LOG_AS(operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG2, "strRet = %s\n", body->c_str());
  return HTTP_RET_OK;
}

// A size line that cannot be read counts as the last chunk, and trailers stay unread.
bool TWHttpClient::ReadChunks(std::string* body) {
  for (;;) {
    char line[kPieceSize];
    const int length = ReadToLineEnd(line, kPieceSize);
    const uint32_t size = length < 1 ? 0 : ParseChunkSize({line, static_cast<size_t>(length)});
    if (size == 0) return true;
    if (!ReadChunk(size, body)) return false;
    DropChunkEnd();
  }
}

bool TWHttpClient::ReadChunk(uint32_t size, std::string* body) {
  char piece[kPieceSize];
  while (size > 0) {
    const int count = ReadData(piece, static_cast<int>(std::min<uint32_t>(size, kPieceSize)));
    if (count < 0) return false;
    body->append(piece, static_cast<size_t>(count));
    size -= static_cast<uint32_t>(count);
    if (m_pSocket->IsEOF()) return true;
  }
  return true;
}

// The two bytes behind a chunk, whatever they are.
void TWHttpClient::DropChunkEnd() {
  char ending[2];
  const int count = ReadData(ending, 2);
  if (count == 1) ReadData(ending, 1);  // direct reading delivers what has arrived
}

// The announced length does not count: the body ends where the server closes.
bool TWHttpClient::ReadToEnd(std::string* body) {
  char piece[kPieceSize];
  for (;;) {
    const int count = ReadData(piece, kPieceSize);
    if (count <= 0) return count == 0;
    body->append(piece, static_cast<size_t>(count));
  }
}
