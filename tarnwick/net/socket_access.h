// What the HTTP client may do with its socket beyond what callers may.
#ifndef TARNWICK_NET_SOCKET_ACCESS_H_
#define TARNWICK_NET_SOCKET_ACCESS_H_

#include <string_view>

#include "tarnwick/net/twsocket.h"

namespace tarnwick {

class SocketAccess {
 public:
  // A socket as `new TWSocket` makes it, but with a read-ahead buffer that is never cleared: nobody
  // derives from it. Of a daemon's many idle clients only what they used is resident.
  static TWSocket* MakePlain() { return new TWSocket(TWSocket::HiddenBuffer()); }

  // Whether the socket reads ahead.
  static bool IsBuffered(const TWSocket* socket) { return socket->m_bBuffered; }

  // What is buffered and unread. The next read of the socket ends it.
  static std::string_view Buffered(const TWSocket* socket) {
    if (socket == nullptr || !socket->m_bBuffered || socket->m_readLen <= 0) return {};
    return {socket->m_readBuf + socket->m_readPos, static_cast<size_t>(socket->m_readLen)};
  }

  // Takes the next `size` bytes, as ReadData does with what is buffered. REQUIRES: they are.
  static void Take(TWSocket* socket, size_t size) {
    socket->m_bEOF = false;
    socket->m_readPos += static_cast<int>(size);
    socket->m_readLen -= static_cast<int>(size);
  }
};

}  // namespace tarnwick

#endif  // TARNWICK_NET_SOCKET_ACCESS_H_
