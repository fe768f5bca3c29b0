#include "tests/support/server_process.h"

#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <thread>

#include "tests/support/ports.h"

namespace {

struct Listener {
  int fd;
  SSL_CTX* context;
  ServedPort served;
};

int Listen(int* port) {
  constexpr int kBacklog = 512;
  const int fd = BindLoopback(port);
  if (fd < 0 || listen(fd, kBacklog) != 0) {
    perror("the server process cannot listen");
    exit(2);
  }
  return fd;
}

void ServeOne(const Listener& listener, int fd, unsigned number) {
  ServerConnection connection(fd, listener.context, listener.served.limit_seconds);
  listener.served.serve(connection, number);
}

void Accept(const Listener& listener, ServerProcess::Connections connections, unsigned number) {
  const int fd = accept4(listener.fd, nullptr, nullptr, SOCK_CLOEXEC);
  if (fd < 0) return;
  if (connections == ServerProcess::Connections::kOneByOne) {
    ServeOne(listener, fd, number);
  } else {
    std::thread(ServeOne, listener, fd, number).detach();
  }
}

[[noreturn]] void Run(const std::vector<Listener>& listeners,
                      ServerProcess::Connections connections) {
  std::vector<pollfd> waiting;
  for (const Listener& listener : listeners) waiting.push_back({listener.fd, POLLIN, 0});
  for (unsigned number = 0;;) {
    poll(waiting.data(), waiting.size(), -1);
    for (size_t i = 0; i < listeners.size(); ++i) {
      if ((waiting[i].revents & POLLIN) != 0) Accept(listeners[i], connections, number++);
    }
  }
}

}  // namespace

ServerProcess::ServerProcess(const std::vector<ServedPort>& served, Connections connections) {
  std::vector<Listener> listeners;
  for (const ServedPort& one : served) {
    int port = 0;
    listeners.push_back({Listen(&port), nullptr, one});
    ports_.push_back(port);
  }
  const pid_t parent = getpid();
  pid_ = fork();
  if (pid_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != parent) _exit(0);
    signal(SIGPIPE, SIG_IGN);
    for (Listener& listener : listeners) {
      const TlsIdentity* const identity = listener.served.identity;
      if (identity != nullptr) listener.context = identity->NewServerContext();
    }
    Run(listeners, connections);
  }
  for (const Listener& listener : listeners) close(listener.fd);
}

ServerProcess::~ServerProcess() {
  if (pid_ <= 0) return;
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
}

Serve RespondWith(const std::string& response) {
  return [response](ServerConnection& connection, unsigned /*number*/) {
    std::string head;
    std::string body;
    if (!connection.Open() || !connection.ReadRequest(&head, &body)) return;
    if (connection.Write(response)) connection.Close();
  };
}
