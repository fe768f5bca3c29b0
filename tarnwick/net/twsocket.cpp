// The socket object: its settings, its life and its options.
#define TW_LOG_SOURCE "twsocket"

#include "tarnwick/net/twsocket.h"

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/cancel.h"

using namespace tarnwick;

TWSocket::TWSocket() : TWSocket(std::string(), -1, -1, false) {}

TWSocket::TWSocket(const std::string& host, int port, int timeout, bool buffered)
    : m_sockFd(-1),
      m_strHost(host),
      m_port(port),
      m_timeout(timeout),
      m_bBuffered(buffered),
      m_bConnected(false),
      m_bEOF(false),
      m_readBuf(),
      m_bBufferIsHidden(false),
      m_bStreamEnded(false),
      m_readPos(0),
      m_readLen(0),
      m_srcAddr(0) {}

// As the default constructor, but for the buffer, of which no page is touched before it is used.
// cppcheck-suppress uninitMemberVarPrivate
TWSocket::TWSocket(HiddenBuffer /*hidden*/)
    : m_sockFd(-1),
      m_port(-1),
      m_timeout(-1),
      m_bBuffered(false),
      m_bConnected(false),
      m_bEOF(false),
      m_bBufferIsHidden(true),
      m_bStreamEnded(false),
      m_readPos(0),
      m_readLen(0),
      m_srcAddr(0) {}

TWSocket::~TWSocket() {
  CloseFd();
}

void TWSocket::CloseFd() {
  m_bStreamEnded = false;
  if (m_sockFd < 0) return;
  const NoCancel no_cancel;
  close(m_sockFd);
  m_sockFd = -1;
}

void TWSocket::ClearReadBuf() {
  if (!m_bBufferIsHidden) std::memset(m_readBuf, 0, sizeof(m_readBuf));
  m_readPos = 0;
  m_readLen = 0;
}

void TWSocket::SetSocketInfo(const std::string& host, int port, int timeout, bool buffered) {
  m_strHost = host;
  m_port = port;
  m_timeout = timeout;
  m_bBuffered = buffered;
  m_bConnected = false;
  m_bEOF = false;
  CloseFd();
  // Direct mode does not use what an earlier connection left in the buffer.
  if (m_bBuffered) ClearReadBuf();
}

void TWSocket::SetRemoteAddr(unsigned int addr) {
  m_srcAddr = addr;
}

int TWSocket::Connect() {
  const int result = ConnectSocket();
  if (result != 0) return result;
  PostConnect();
  return 0;
}

int TWSocket::PostConnect() {
  int nonBlocking = m_timeout >= 0 ? 1 : 0;
  ioctl(m_sockFd, FIONBIO, &nonBlocking);
  return 0;
}

void TWSocket::Disconnect() {
  CloseFd();
  m_bConnected = false;
  if (m_bBuffered) ClearReadBuf();
}

int TWSocket::SetKeepAliveOpt(int enable, int idle, int interval, int count) {
  const struct {
    int level;
    int name;
    const int& value;
    const char* text;
  } options[] = {
      {SOL_SOCKET, SO_KEEPALIVE, enable, "keepalive"},
      {IPPROTO_TCP, TCP_KEEPIDLE, idle, "keepidle"},
      {IPPROTO_TCP, TCP_KEEPINTVL, interval, "keepintvl"},
      {IPPROTO_TCP, TCP_KEEPCNT, count, "keepcnt"},
  };
  for (const auto& option : options) {
    if (setsockopt(m_sockFd, option.level, option.name, &option.value, sizeof(option.value)) != 0) {
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Failed to set %s option.\n", option.text);
      return -1;
    }
    if (enable == 0) return 0;
  }
  return 0;
}
