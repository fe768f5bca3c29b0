// What the HTTP client may do with its socket beyond what callers may.
#ifndef TARNWICK_NET_SOCKET_ACCESS_H_
#define TARNWICK_NET_SOCKET_ACCESS_H_

#include <string_view>

#include "tarnwick/net/twsocket.h"

class SocketAccess {
 public:
  // A socket as `new TWSocket` gives it, but with a read-ahead buffer of no particular contents: no
  // derived class looks into it. Of a daemon's many idle clients only what they used is resident.
  static TWSocket* MakePlain() { return new TWSocket(TWSocket::UnsetBuffer()); }

  // Takes the next `len` bytes where all of them are buffered; ReadData would do just that and copy
  // them. Otherwise nothing happens, and the result is empty. The next call of the socket ends it.
  static std::string_view TakeBuffered(TWSocket* socket, int len) {
    if (socket == nullptr || !socket->m_bBuffered) return {};
    if (len <= 0 || len > socket->m_readLen) return {};
    const char* const bytes = socket->m_readBuf + socket->m_readPos;
    socket->m_bEOF = false;
    socket->m_readPos += len;
    socket->m_readLen -= len;
    return {bytes, static_cast<size_t>(len)};
  }
};

#endif  // TARNWICK_NET_SOCKET_ACCESS_H_
