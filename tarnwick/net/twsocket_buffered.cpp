// Reading: straight from the descriptor, and through the read-ahead and push-back buffer.
#define TW_LOG_SOURCE "twsocket"

#include <cerrno>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/twsocket.h"

namespace {

// The log names the operation that callers know.
constexpr char kReadData[] = "ReadData";

// What is left free behind a read-ahead is there for push-back.
constexpr int kPushBackRoom = 1024;

// A request of this size goes straight to the caller's memory, which saves a copy.
constexpr int kStraightSize = 1024;

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
  if (count == 0) MeetEndOfFile();
  return count;
}

int TWSocket::ReadBuffered(char* buf, int len) {
  if (len == 0) return 0;
  int done = 0;
  for (int retries = 0; m_readLen < len - done;) {
    done += TakeBuffered(buf + done, m_readLen);
    m_readPos = 0;
    if (!ReadStraight(buf, len, &done)) return -1;
    if (done == len) return len;
    if (!WaitReadable()) return -1;
    const int count = _Read(m_readBuf, kReadBufSize - kPushBackRoom);
    if (count > 0) {
      m_readLen = count;
    } else if (count == 0) {
      MeetEndOfFile();
      return done;
    } else if (done > 0) {
      LogFailedRead();
      return done;
    } else if (!MayRetry(retries++)) {
      return -1;
    }
  }
  TakeBuffered(buf + done, len - done);
  return len;
}

// Moves `len` buffered bytes to the caller. REQUIRES: len <= m_readLen.
int TWSocket::TakeBuffered(char* buf, int len) {
  std::memcpy(buf, m_readBuf + m_readPos, static_cast<size_t>(len));
  m_readPos += len;
  m_readLen -= len;
  return len;
}

// Reads into the caller's memory while much is missing. After an error or the end of the stream the
// read-ahead has the last word, unless nothing was delivered at all: then the call has failed.
bool TWSocket::ReadStraight(char* buf, int len, int* done) {
  while (len - *done >= kStraightSize) {
    if (!WaitReadable()) return false;
    const int count = _Read(buf + *done, static_cast<unsigned int>(len - *done));
    if (count == 0) {
      MeetEndOfFile();
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
bool TWSocket::MayRetry(int retries) {
  if ((errno == EAGAIN || errno == EINTR) && retries < kMaxRetries) return true;
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_INFO,
            "Read socket [%d] failed with errno [%d], retry [%d].\n", m_sockFd, errno, retries);
  m_bConnected = false;
  return false;
}

bool TWSocket::WaitReadable() {
  if (DoSelect(SELECT_READ) >= 0) return true;
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Failed to select socket [%d]\n",
            m_sockFd);
  return false;
}

void TWSocket::MeetEndOfFile() {
  m_bEOF = true;
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Reach end of file!\n");
}

void TWSocket::LogFailedRead() {
  TW_LOG_AS(kReadData, LOG_CATEG_SOCKET, LOG_LEVEL_INFO,
            "Read socket [%d] failed with errno [%d].\n", m_sockFd, errno);
}

int TWSocket::RestoreData(char* data, int len) {
  if (!m_bBuffered) return 0;
  if (data == nullptr || len < 0 || len > kReadBufSize - m_readLen) return -1;
  const size_t size = static_cast<size_t>(len);
  if (m_readLen > 0) {
    std::memmove(m_readBuf + size, m_readBuf + m_readPos, static_cast<size_t>(m_readLen));
  }
  std::memcpy(m_readBuf, data, size);
  m_readPos = 0;
  m_readLen += len;
  return 0;
}
