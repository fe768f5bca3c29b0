#include "bench/peer.h"

#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>

#include "bench/listen.h"
#include "bench/measured.h"

namespace {

// The length that the request announces for its body.
size_t BodyLength(const std::string& request) {
  const size_t found = request.find("Content-Length: ");
  return found == std::string::npos ? 0 : std::strtoul(request.c_str() + found + 16, nullptr, 10);
}

bool IsComplete(const std::string& request) {
  const size_t end = request.find("\r\n\r\n");
  return end != std::string::npos && request.size() >= end + 4 + BodyLength(request);
}

void Answer(int connection, const std::string& reply) {
  std::string request;
  char piece[8192];
  while (!IsComplete(request)) {
    const ssize_t count = read(connection, piece, sizeof(piece));
    if (count <= 0) return;
    request.append(piece, static_cast<size_t>(count));
  }
  if (send(connection, reply.data(), reply.size(), MSG_NOSIGNAL) < 0) return;
}

[[noreturn]] void Serve(int listener, const std::vector<std::string>& replies) {
  for (size_t i = 0;; i = (i + 1) % replies.size()) {
    const int connection = accept(listener, nullptr, nullptr);
    if (connection < 0) _exit(1);
    Answer(connection, replies[i]);
    close(connection);
  }
}

}  // namespace

Peer::Peer(const std::vector<std::string>& replies) : m_port(0), m_child(-1) {
  const int listener = ListenOnLoopback(&m_port);
  m_child = fork();
  Expect(m_child >= 0, "server", "cannot be started");
  if (m_child == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);  // also when the measured process is stopped
    Serve(listener, replies);
  }
  close(listener);
}

Peer::~Peer() {
  kill(m_child, SIGKILL);
  waitpid(m_child, nullptr, 0);
}
