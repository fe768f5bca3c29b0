// The network of a fuzz program: the library's calls of socket, connect, select, read and write
// reach scripted peers in memory, by the linker's --wrap. Descriptors of anything else are left
// alone, and without a Wire so is everything.
//
//   Wire wire(connections, {1, 64});
//   client.SendRequestByGet();  // talks to connections[0]
//   wire.Dialled()[0].Written();  // the request
#ifndef TARNWICK_FUZZ_SUPPORT_WIRE_H_
#define TARNWICK_FUZZ_SUPPORT_WIRE_H_

#include <sys/select.h>

#include <cstddef>
#include <deque>
#include <string>
#include <vector>

#include "fuzz/support/peer.h"
#include "fuzz/support/script.h"

// The n-th connect reaches the n-th connection; after the last one it is refused.
// REQUIRES: one at a time.
class Wire {
 public:
  Wire(std::vector<Connection> connections, std::vector<size_t> sizes);
  ~Wire();
  Wire(const Wire&) = delete;
  Wire& operator=(const Wire&) = delete;

  // The peers that were dialled, refusing ones included.
  const std::deque<Peer>& Dialled() const { return dialled_; }

  // The descriptors and address lists that are in use.
  int Open() const { return open_; }

  // For the wrappers.
  static Wire* Current();
  static bool IsOurs(int fd);
  int Socket();
  int Connect(int fd);
  int Control(int fd, int command, int argument);
  int Select(int nfds, fd_set* readable, fd_set* writable, fd_set* exceptional);
  int SocketError(int fd) const;
  long Read(int fd, void* buf, size_t len);
  long Write(int fd, const void* buf, size_t len);
  int Close(int fd);
  void Opened() { ++open_; }
  void Closed() { --open_; }

 private:
  static constexpr int kDescriptors = 64;

  struct Descriptor {
    bool open = false;
    int flags = 0;
    Peer* peer = nullptr;
    bool connecting = false;
  };

  Descriptor* At(int fd);
  int SelectConnecting(const Descriptor& descriptor, fd_set* readable);

  std::vector<Connection> connections_;
  std::vector<size_t> sizes_;
  std::deque<Peer> dialled_;
  Descriptor descriptors_[kDescriptors];
  int open_ = 0;
};

// The time that time(2) shows the library; the real one when negative.
extern long g_fuzz_time;

#endif  // TARNWICK_FUZZ_SUPPORT_WIRE_H_
