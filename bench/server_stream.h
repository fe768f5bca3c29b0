// The server's side of one connection, plain or TLS.
#ifndef TARNWICK_BENCH_SERVER_STREAM_H_
#define TARNWICK_BENCH_SERVER_STREAM_H_

#include <openssl/ssl.h>
#include <sys/types.h>

// A certificate of the server's own making.
class ServerIdentity {
 public:
  explicit ServerIdentity(bool tls);
  ~ServerIdentity() { SSL_CTX_free(m_context); }
  ServerIdentity(const ServerIdentity&) = delete;
  ServerIdentity& operator=(const ServerIdentity&) = delete;

  SSL_CTX* Context() const { return m_context; }  // null: plain connections

 private:
  SSL_CTX* m_context;
};

class ServerStream {
 public:
  ServerStream(int fd, const ServerIdentity& identity);
  ~ServerStream();
  ServerStream(const ServerStream&) = delete;
  ServerStream& operator=(const ServerStream&) = delete;

  // Results: as those of read(2).
  ssize_t Read(char* to, size_t room);

  // Writes all, or what the client takes.
  void Write(const char* bytes, size_t size);

 private:
  const int m_fd;
  SSL* m_ssl = nullptr;
};

#endif  // TARNWICK_BENCH_SERVER_STREAM_H_
