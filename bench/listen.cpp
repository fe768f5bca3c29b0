#include "bench/listen.h"

#include <netinet/in.h>
#include <sys/socket.h>

#include "bench/measured.h"

int ListenOnLoopback(int* port) {
  const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  struct sockaddr_in address = {};
  socklen_t size = sizeof(address);
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  auto* const general = reinterpret_cast<struct sockaddr*>(&address);
  Expect(bind(listener, general, size) == 0 && listen(listener, 64) == 0, "server",
         "cannot listen");
  Expect(getsockname(listener, general, &size) == 0, "server", "has no port");
  *port = ntohs(address.sin_port);
  return listener;
}
