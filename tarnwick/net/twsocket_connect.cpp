// Connecting: name resolution, source address, and the connect with and without a time-out.
#define TW_LOG_SOURCE "twsocket"

#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/twsocket.h"
#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/fd_set.h"
#include "tarnwick/platform/unique.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

namespace {

struct AddressListDeleter {
  void operator()(struct addrinfo* list) const {
    const ErrnoSaver keeper;  // callers find the connect's errno
    freeaddrinfo(list);
  }
};
using AddressList = std::unique_ptr<struct addrinfo, AddressListDeleter>;

// Results: false when the name resolution failed. One that succeeds may still find no address.
bool Resolve(const std::string& host, int port, AddressList* addresses) {
  struct addrinfo hints = {};
  hints.ai_family = AF_INET;
  hints.ai_socktype = SOCK_STREAM;
  struct addrinfo* list = nullptr;
  const NoCancel no_cancel;
  if (getaddrinfo(host.c_str(), IntToString(port).c_str(), &hints, &list) != 0) return false;
  addresses->reset(list);
  return true;
}

// Why a connect with a time-out did not succeed, with its errno.
struct ConnectOutcome {
  enum Kind {
    kConnected,
    kFailedImmediately,
    kTimedOut,
    kSelectFailed,
    kNotReady,
    kNoStatus,
    kFailed
  };
  Kind kind;
  int error;
};

// Waits for the descriptor to become readable or writable. The wait resumes after a signal with the
// time that the kernel has left in the time value.
ConnectOutcome WaitForConnect(int fd, int timeout) {
  FdSet readable(fd);
  FdSet writable(fd);
  if (!readable.Valid() || !writable.Valid()) return {ConnectOutcome::kSelectFailed, ENOMEM};
  struct timeval left = {timeout, 0};
  int ready;
  do {
    readable.Fill();
    writable.Fill();
    ready = select(readable.Count(), readable.Get(), writable.Get(), nullptr, &left);
  } while (ready == -1 && errno == EINTR);
  if (ready == 0) return {ConnectOutcome::kTimedOut, ETIMEDOUT};
  if (ready == -1) return {ConnectOutcome::kSelectFailed, errno};
  if (!readable.Contains() && !writable.Contains()) return {ConnectOutcome::kNotReady, 0};
  return {ConnectOutcome::kConnected, 0};
}

ConnectOutcome GetSocketError(int fd) {
  int error = 0;
  socklen_t size = sizeof(error);
  if (getsockopt(fd, SOL_SOCKET, SO_ERROR, &error, &size) != 0) {
    return {ConnectOutcome::kNoStatus, errno};
  }
  return {error == 0 ? ConnectOutcome::kConnected : ConnectOutcome::kFailed, error};
}

ConnectOutcome ConnectNonBlocking(int fd, const struct addrinfo& address, int timeout) {
  if (connect(fd, address.ai_addr, address.ai_addrlen) == 0) return {ConnectOutcome::kConnected, 0};
  if (errno != EINPROGRESS) return {ConnectOutcome::kFailedImmediately, errno};
  const ConnectOutcome outcome = WaitForConnect(fd, timeout);
  return outcome.kind == ConnectOutcome::kConnected ? GetSocketError(fd) : outcome;
}

}  // namespace

int TWSocket::BindRemoteAddr() {
  struct sockaddr_in source = {};
  source.sin_family = AF_INET;
  source.sin_addr.s_addr = m_srcAddr;
  if (bind(m_sockFd, reinterpret_cast<struct sockaddr*>(&source), sizeof(source)) == 0) return 0;
  const int error = errno;
  TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO,
         "bind(SockFd=%d, SrcSock.sin_addr.s_addr = %lu) error!! errno=%d, err_str=[%s]\n",
         m_sockFd, static_cast<unsigned long>(m_srcAddr), error, strerror(error));
  return -1;
}

bool TWSocket::ConnectWithTimeout(const struct addrinfo* address) {
  if (m_sockFd < 0 || address == nullptr) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Invalid parameters!\n");
    return false;
  }
  // A new socket has no flags, should they not be readable.
  const int flags = std::max(fcntl(m_sockFd, F_GETFL), 0);
  if (fcntl(m_sockFd, F_SETFL, flags | O_NONBLOCK) == -1) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Set nonblock flag failed.\n");
  }
  const ConnectOutcome outcome = ConnectNonBlocking(m_sockFd, *address, m_timeout);
  switch (outcome.kind) {
    case ConnectOutcome::kConnected:
      break;
    case ConnectOutcome::kFailedImmediately:
      // Says the opposite of what happened. Messages are never reworded; pinned by
      // ConnectEdges.AConnectionThatIsRefusedAtOnceIsLoggedAsConnected.
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Socket connected.\n");
      break;
    case ConnectOutcome::kTimedOut:
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Socket connect timeout.\n");
      break;
    case ConnectOutcome::kSelectFailed:
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Select failed with errno [%d].\n", outcome.error);
      break;
    case ConnectOutcome::kNotReady:
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Socket strange bug.\n");
      break;
    case ConnectOutcome::kNoStatus:
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "getsockopt error!\n");
      break;
    case ConnectOutcome::kFailed:
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Socket connection failed with error [%d].\n",
             outcome.error);
      break;
  }
  if (fcntl(m_sockFd, F_SETFL, flags) == -1) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Set back blocking flag failed.\n");
  }
  errno = outcome.error;  // ETIMEDOUT is how callers tell a time-out from a refusal
  return outcome.kind == ConnectOutcome::kConnected;
}

int TWSocket::ConnectSocket() {
  Disconnect();
  m_sockFd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (m_sockFd < 0) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Socket initialization failed!\n");
    return -1;
  }
  // Another way out of the machine is better than none.
  if (m_srcAddr != 0 && BindRemoteAddr() != 0) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Failed to bind src ip, ignore it.\n");
  }
  AddressList addresses;
  if (!Resolve(m_strHost, m_port, &addresses)) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Scoket getaddrinfo incomplete.\n");
    return -1;
  }
  if (m_timeout < 0) {
    m_bConnected = addresses && connect(m_sockFd, addresses->ai_addr, addresses->ai_addrlen) == 0;
    if (!m_bConnected) TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Socket connect failed.\n");
  } else {
    m_bConnected = ConnectWithTimeout(addresses.get());
    // Logged for a refusal as well: the one line that ends each failed attempt.
    if (!m_bConnected) {
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_INFO, "Socket connect timeout (%d)\n", m_timeout);
    }
  }
  return m_bConnected ? 0 : -1;
}
