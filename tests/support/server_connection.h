// One connection as the soak's server sees it: plain or TLS, blocking, with limits of time.
#ifndef TARNWICK_TESTS_SUPPORT_SERVER_CONNECTION_H_
#define TARNWICK_TESTS_SUPPORT_SERVER_CONNECTION_H_

#include <openssl/ssl.h>

#include <cstddef>
#include <string>

// Threads: one thread.
class Channel {
 public:
  // Owns `fd`. `context` is null for a plain connection.
  Channel(int fd, SSL_CTX* context);
  ~Channel();
  Channel(const Channel&) = delete;
  Channel& operator=(const Channel&) = delete;

  // Makes the handshake of a TLS connection.
  bool Open();

  // Reads up to and including `mark`, or `count` bytes; false when the client ends before that.
  bool ReadUntil(const std::string& mark, std::string* bytes);
  bool ReadBytes(size_t count, std::string* bytes);

  bool Write(const std::string& bytes);
  bool WriteBelowTls(const std::string& bytes) const;

  // Ends the connection in order and waits for the client to end it as well: bytes that it still
  // sends would else turn the close into a reset.
  void Close();

  // Ends it without a close notice; with a reset.
  void Cut();
  void Reset();

  // Sends nothing more until the client gives up, or for longer than the client's limit.
  void Stall() const;

 private:
  bool ReadMore();

  int fd_;
  SSL* ssl_ = nullptr;
  std::string pending_;
};

#endif  // TARNWICK_TESTS_SUPPORT_SERVER_CONNECTION_H_
