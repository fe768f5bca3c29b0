#include "tests/soak/server.h"

#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <thread>

#include "tests/soak/response.h"
#include "tests/support/ports.h"
#include "tests/support/tls_identity.h"

namespace {

constexpr int kBacklog = 512;

struct Listener {
  int fd;
  SSL_CTX* context;  // null: plain
  void (*serve)(Channel*, unsigned seed);
};

void ServeHttp(Channel* channel, unsigned /*seed*/) {
  if (!channel->Open()) return;
  Request request;
  while (ReadRequest(channel, &request) && SendReply(channel, request)) {
  }
}

void HangUp(Channel* /*channel*/, unsigned /*seed*/) {}

void SendNoise(Channel* channel, unsigned seed) {
  if (channel->WriteBelowTls(Noise(seed))) channel->Cut();
}

void StaySilent(Channel* channel, unsigned /*seed*/) {
  channel->Stall();
}

int Listen(int* port) {
  const int fd = BindLoopback(port);
  if (fd < 0 || listen(fd, kBacklog) != 0) {
    perror("the soak's server cannot listen");
    exit(2);
  }
  return fd;
}

[[noreturn]] void AcceptForEver(const std::vector<Listener>& listeners) {
  std::vector<pollfd> waiting;
  for (const Listener& listener : listeners) waiting.push_back({listener.fd, POLLIN, 0});
  for (unsigned seed = 0;;) {
    poll(waiting.data(), waiting.size(), -1);
    for (size_t i = 0; i < listeners.size(); ++i) {
      if ((waiting[i].revents & POLLIN) == 0) continue;
      const int fd = accept4(listeners[i].fd, nullptr, nullptr, SOCK_CLOEXEC);
      if (fd < 0) continue;
      std::thread([fd, seed, listener = listeners[i]] {
        Channel channel(fd, listener.context);
        listener.serve(&channel, seed);
      }).detach();
      ++seed;
    }
  }
}

}  // namespace

Server::Server() {
  // Made here, so that the parent removes the files at the end.
  static const TlsIdentity identity{TlsOptions()};
  TlsOptions wrong;
  wrong.authority = "Another authority";
  wrong.wrong_host = true;
  static const TlsIdentity stranger{wrong};
  ca_file_ = identity.CaFile();
  const int plain = Listen(&ports_.plain);
  const int tls = Listen(&ports_.tls);
  const int bad_certificate = Listen(&ports_.bad_certificate);
  const int hang_up = Listen(&ports_.hang_up);
  const int noise = Listen(&ports_.noise);
  const int silence = Listen(&ports_.silence);
  const pid_t parent = getpid();
  pid_ = fork();
  if (pid_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != parent) _exit(0);
    signal(SIGPIPE, SIG_IGN);
    AcceptForEver({{plain, nullptr, ServeHttp},
                   {tls, identity.NewServerContext(), ServeHttp},
                   {bad_certificate, stranger.NewServerContext(), ServeHttp},
                   {hang_up, nullptr, HangUp},
                   {noise, nullptr, SendNoise},
                   {silence, nullptr, StaySilent}});
  }
  for (const int fd : {plain, tls, bad_certificate, hang_up, noise, silence}) close(fd);
}

Server::~Server() {
  if (pid_ <= 0) return;
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
}
