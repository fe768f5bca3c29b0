// One accepted connection, plain or with TLS: every call has a limit, and another thread can stop
// it.
#ifndef TARNWICK_TOOLS_TWCAMSIM_CONNECTION_H_
#define TARNWICK_TOOLS_TWCAMSIM_CONNECTION_H_

#include <openssl/ssl.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

enum class Io {
  kDone,
  kEnd,      // the peer closed its direction
  kReset,    // the peer is gone
  kTimeout,  // the limit passed
  kStopped,  // Stop was called
  kError,    // a fault of TLS; ErrorText tells
};

// Threads: one at a time, but for Stop.
class Connection {
 public:
  using Milliseconds = std::chrono::milliseconds;

  // Owns `fd`, a connected TCP socket.
  explicit Connection(int fd);
  ~Connection();
  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;

  // Makes every call, the current one included, return kStopped.
  void Stop();

  // The server's part of TLS. From then on Read and Write go through it.
  Io Handshake(SSL_CTX* context, Milliseconds limit);

  // Appends what comes, `most` bytes at most.
  Io Read(std::string* bytes, size_t most, Milliseconds limit);

  Io Write(std::string_view bytes, Milliseconds limit);

  // Under TLS.
  Io ReadRaw(std::string* bytes, size_t most, Milliseconds limit);
  Io WriteRaw(std::string_view bytes, Milliseconds limit);

  // Waits for that long: kDone after it, kReset when the peer breaks the connection.
  Io Pause(Milliseconds span);

  // Waits until the peer leaves, and throws away what it sends. TLS is of no use after that.
  Io WaitUntilPeerLeaves(Milliseconds limit);

  // The same without reading.
  Io WaitUnread(Milliseconds limit);

  // Ends the connection in good order. Waits a moment for the peer's end, so that bytes of it that
  // nobody read do not turn the end into a reset.
  void Close(bool close_notice);

  // Ends it by a reset.
  void Reset();

  bool IsOpen() const;
  std::string Peer() const;
  std::string TlsVersion() const;  // empty without TLS
  const std::string& ErrorText() const;

  // Bytes of HTTP; what TLS adds is not counted.
  uint64_t BytesIn() const;
  uint64_t BytesOut() const;

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_CONNECTION_H_
