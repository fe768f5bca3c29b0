// One connection of a server process: plain or TLS, blocking, with limits of time.
#ifndef TARNWICK_TESTS_SUPPORT_SERVER_CONNECTION_H_
#define TARNWICK_TESTS_SUPPORT_SERVER_CONNECTION_H_

#include <openssl/ssl.h>

#include <cstddef>
#include <string>

// Threads: one thread.
class ServerConnection {
 public:
  // Owns `fd`. `context` is null for a plain connection.
  ServerConnection(int fd, SSL_CTX* context, int limit_seconds);
  ~ServerConnection();
  ServerConnection(const ServerConnection&) = delete;
  ServerConnection& operator=(const ServerConnection&) = delete;

  // Makes the handshake of a TLS connection.
  bool Open();

  // Reads up to and including `mark`, or `count` bytes; false when the client ends before that.
  bool ReadUntil(const std::string& mark, std::string* bytes);
  bool ReadBytes(size_t count, std::string* bytes);

  // Reads a head, with its empty line, and the body that its Content-Length announces, unless that is
  // an upload's, which has no end.
  bool ReadRequest(std::string* head, std::string* body);

  bool Write(const std::string& bytes);
  bool WriteBelowTls(const std::string& bytes) const;

  // Sends the close notice of TLS.
  void Notify();

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
