// Reading data and lines: from the descriptor, and through the read-ahead and push-back buffer.
#define TW_LOG_SOURCE "twsocket"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/twsocket.h"

namespace {

// The log names the operation that callers know.
constexpr char kReadData[] = "ReadData";

// What is left free after a read-ahead, so that RestoreData can push back.
constexpr int kPushbackReserve = 1024;

// A request of this size goes straight to the caller's memory, which saves a copy.
constexpr int kBypassThreshold = 1024;

// How far one search for the end of a line goes. Larger searches scan the same bytes again where
// lines are short.
constexpr int kScanSize = 256;

// How often a small read that delivered nothing is tried again.
constexpr int kMaxRetries = 6;

}  // namespace

int TWSocket::ReadData(char* buf, int len) {
  if (len < 0 || (buf == nullptr && len > 0)) return -1;
  m_bEOF = false;
  return m_bBuffered ? ReadBuffered(buf, len) : ReadDirect(buf, len);
}

int TWSocket::ReadDirect(char* buf, int len) {
  if (!WaitReadable()) return -1;
  const int count = _Read(buf, static_cast<unsigned int>(len));
  if (count == 0) OnEndOfStream();
  return count;
}

int TWSocket::ReadBuffered(char* buf, int len) {
  if (len == 0) return 0;
  int done = 0;
  for (int retries = 0; m_readLen < len - done;) {
    done += ConsumeBuffered(buf + done, m_readLen);
    m_readPos = 0;
    if (!ReadUnbuffered(buf, len, &done)) return -1;
    if (done == len) return len;
    if (!WaitReadable()) return -1;
    const int count = _Read(m_readBuf, kReadBufSize - kPushbackReserve);
    if (count > 0) {
      m_readLen = count;
    } else if (count == 0) {
      OnEndOfStream();
      return done;
    } else if (done > 0) {
      LogFailedRead();
      return done;
    } else if (!ShouldRetryRead(retries++)) {
      return -1;
    }
  }
  ConsumeBuffered(buf + done, len - done);
  return len;
}

// Moves `len` buffered bytes to the caller. REQUIRES: len <= m_readLen.
int TWSocket::ConsumeBuffered(char* buf, int len) {
  std::memcpy(buf, m_readBuf + m_readPos, static_cast<size_t>(len));
  m_readPos += len;
  m_readLen -= len;
  return len;
}

// Moves bytes of a line to the caller, at most `room`, of which none ends it. It may stop early:
// what comes next is read byte by byte, with all that such a read does at the end of the buffer.
int TWSocket::ConsumeLineBody(char* buf, int room) {
  const size_t size = static_cast<size_t>(std::max(std::min({m_readLen, room, kScanSize}), 0));
  const char* const begin = m_readBuf + m_readPos;
  const void* end = std::memchr(begin, '\n', size);
  size_t length =
      end != nullptr ? static_cast<size_t>(static_cast<const char*>(end) - begin) : size;
  end = std::memchr(begin, '\r', length);
  if (end != nullptr) length = static_cast<size_t>(static_cast<const char*>(end) - begin);
  return ConsumeBuffered(buf, static_cast<int>(length));
}

// Consumes the end of a line, as two reads of one byte would, when both are buffered.
bool TWSocket::ConsumeLineEnding() {
  if (m_readLen < 2) return false;
  const char first = m_readBuf[m_readPos];
  if (first != '\r' && first != '\n') return false;
  const int size = first == '\r' ? 2 : 1;
  m_bEOF = false;
  m_readPos += size;
  m_readLen -= size;
  return true;
}

// Reads into the caller's memory while much is missing. After an error or the end of the stream the
// read-ahead has the last word, unless nothing was delivered at all: then the call has failed.
bool TWSocket::ReadUnbuffered(char* buf, int len, int* done) {
  while (len - *done >= kBypassThreshold) {
    if (!WaitReadable()) return false;
    const int count = _Read(buf + *done, static_cast<unsigned int>(len - *done));
    if (count == 0) {
      OnEndOfStream();
      return true;
    }
    if (count < 0) {
      LogFailedRead();
      if (*done == 0) m_bConnected = false;
      return *done > 0;
    }
    *done += count;
    TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_DEBUG3, "Have read %d bytes.\n", count);
  }
  return true;
}

// After a read-ahead that failed with nothing delivered.
bool TWSocket::ShouldRetryRead(int retries) {
  if ((errno == EAGAIN || errno == EINTR) && retries < kMaxRetries) return true;
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_INFO,
            "Read socket [%d] failed with errno [%d], retry [%d].\n", m_sockFd, errno, retries);
  m_bConnected = false;
  return false;
}

// A peer may keep the connection open after TLS's close notice, and nothing is worth a wait then.
bool TWSocket::WaitReadable() {
  const int configured = m_timeout;
  if (m_bStreamEnded && m_timeout > 0) m_timeout = 0;
  const int ready = DoSelect(SELECT_READ);
  m_timeout = configured;
  if (ready >= 0) return true;
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Failed to select socket [%d]\n",
            m_sockFd);
  return false;
}

void TWSocket::OnEndOfStream() {
  m_bEOF = true;
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Reach end of file!\n");
}

void TWSocket::LogFailedRead() {
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_INFO,
            "Read socket [%d] failed with errno [%d].\n", m_sockFd, errno);
}

int TWSocket::ReadToLineEnd(char* buf, int bufLen) {
  if (buf == nullptr || bufLen <= 0) return -1;
  int length = 0;
  for (;;) {
    if (m_bBuffered) {
      length += ConsumeLineBody(buf + length, bufLen - 1 - length);
      if (ConsumeLineEnding()) break;
    }
    char byte;
    const int count = ReadData(&byte, 1);
    if (count < 0) return -1;
    if (count == 0 || byte == '\n') break;
    if (byte == '\r') {
      // Whatever follows is dropped, not only a line feed. Kept as it is: callers may depend on it;
      // pinned by ReadToLineEnd.ACarriageReturnDropsTheNextByteWhateverItIs.
      if (ReadData(&byte, 1) <= 0) return -1;
      break;
    }
    buf[length++] = byte;
    if (length == bufLen) {
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO,
             "BufLen [%d] reached before line ending when read Fd [%d],terminate buffer "
             "explicitly.\n",
             bufLen, m_sockFd);
      // The byte just stored makes room for the terminating zero and is lost.
      --length;
      break;
    }
  }
  buf[length] = '\0';
  return length;
}

int TWSocket::RestoreData(char* data, int len) {
  if (!m_bBuffered) return 0;
  if (data == nullptr || len < 0 || len > kReadBufSize - m_readLen) return -1;
  const size_t size = static_cast<size_t>(len);
  const size_t unread = static_cast<size_t>(m_readLen);
  const size_t pos = static_cast<size_t>(m_readPos);
  if (unread > 0) std::memmove(m_readBuf + size, m_readBuf + pos, unread);
  std::memcpy(m_readBuf, data, size);
  m_readPos = 0;
  m_readLen += len;
  return 0;
}
