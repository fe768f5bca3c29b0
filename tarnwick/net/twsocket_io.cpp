// Waiting, and raw reads and writes.
#define TW_LOG_SOURCE "twsocket"

#include <unistd.h>

#include <cerrno>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/twsocket.h"
#include "tarnwick/platform/fd_set.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

namespace {

// Results: those of select; -1 with ENOMEM when there was no memory for the sets.
int SelectOnce(bool forReading, FdSet* wanted, FdSet* exceptional, struct timeval* left) {
  if (!wanted->Valid() || !exceptional->Valid()) {
    errno = ENOMEM;
    return -1;
  }
  wanted->Fill();
  exceptional->Fill();
  return select(wanted->Count(), forReading ? wanted->Get() : nullptr,
                forReading ? nullptr : wanted->Get(), exceptional->Get(), left);
}

}  // namespace

int TWSocket::DoSelect(SELECT_TYPE type) {
  if (m_sockFd < 0) return -1;
  if (m_timeout < 0) return 0;
  FdSet wanted(m_sockFd);
  FdSet exceptional(m_sockFd);
  // The kernel counts the time down across signals and repetitions.
  struct timeval left = {m_timeout, 0};
  for (;;) {
    const int ready = SelectOnce(type == SELECT_READ, &wanted, &exceptional, &left);
    if (ready == 0) return 0;
    if (ready > 0) {
      if (wanted.Contains() || exceptional.Contains()) return ready;
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Strange thing happens, try to select again!\n");
    } else if (errno == EINTR) {
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Got EINTR while select socket [%d].\n", m_sockFd);
    } else {
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Select Fd [%d] failed with errno [%d]\n", m_sockFd,
             errno);
      return -1;
    }
  }
}

int TWSocket::_Read(void* buf, unsigned int len) {
  return static_cast<int>(read(m_sockFd, buf, len));
}

int TWSocket::_Write(const void* buf, unsigned int len) {
  return WriteFd(m_sockFd, buf, static_cast<int>(len));
}

int TWSocket::WriteData(const char* buf, int len) {
  if (buf == nullptr || len <= 0) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Invalid parameter!\n");
    return -1;
  }
  if (m_sockFd < 0) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Invalid socket fd!\n");
    return -1;
  }
  // The write itself tells what is wrong with the connection, so a failed wait does not end here.
  if (DoSelect(SELECT_WRITE) < 0) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Failed to select socket [%d]\n", m_sockFd);
  }
  const int written = _Write(buf, static_cast<unsigned int>(len));
  if (written < 0) m_bConnected = false;
  return written;
}

bool TWSocket::HasDataToRead(int timeout) {
  const int configured = m_timeout;
  m_timeout = timeout;
  const int ready = DoSelect(SELECT_READ);
  m_timeout = configured;
  return ready > 0;
}
