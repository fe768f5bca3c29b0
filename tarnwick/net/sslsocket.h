// A TLS client connection: TWSocket with OpenSSL underneath. Reading, writing, line reading and
// push-back work as in TWSocket.
//
// Certificates are not verified, no server name is sent and no certificate shown, and OpenSSL's
// default protocols and ciphers apply: it protects the bytes from listeners, and does not prove who
// answers.
//
// Failures that TLS reports are logged in category socket at error, as source sslsocket, such as
// "Failed to established SSL conn. with error [1] [...]." and, for a read that failed or that a
// fatal alert of the peer ended, "Read error [N] [...].".
#ifndef TARNWICK_NET_SSLSOCKET_H_
#define TARNWICK_NET_SSLSOCKET_H_

#include <string>

#include "tarnwick/net/twsocket.h"

struct ssl_ctx_st;
struct ssl_st;

// A TWSocket whose bytes are encrypted.
// Threads: one thread uses an object at a time. OpenSSL is initialised when the library is loaded.
class TARNWICK_API SSLSocket : public TWSocket {
 public:
  // As the constructors of TWSocket. When OpenSSL cannot give its objects, that is logged and every
  // later connect, read and write fails with -1.
  SSLSocket();
  SSLSocket(const std::string& host, int port, int timeout, bool buffered);
  ~SSLSocket() override;

  // Connects and makes the TLS handshake.
  //
  // Results: 0; negative on failure; after a failed handshake the descriptor is closed.
  // Blocks as TWSocket::Connect, and then for the handshake, which has no limit.
  int Connect() override;

  // Sends the close notice on a connection that is still taken for connected, does not wait for the
  // peer's, and closes the descriptor. With a negative time-out it waits while the peer takes
  // nothing.
  void Disconnect() override;

  // As TWSocket::DoSelect, but 0 at once for SELECT_READ while decrypted bytes are waiting; then
  // HasDataToRead returns false, and ReadData returns them without a wait. After the peer's close
  // notice ReadData does not wait; DoSelect and HasDataToRead do, as on TCP.
  int DoSelect(SELECT_TYPE type) override;

  // Reads at most `len` decrypted bytes.
  // Results: the bytes read; 0 when the peer closed, with or without a close notice, and when it
  //   ended the connection by a fatal alert (logged); -1 on an error (logged), when errno is 0 or
  //   the failing system call's, and without a connection, when errno stays.
  // Blocks for `timeout` seconds whenever more of a record is missing; after DoSelect, which has
  // waited as long, a silent peer costs a read twice the time-out.
  int _Read(void* buf, unsigned int len) override;

  // Writes `len` bytes in pieces of at most 32,000. Results: `len`, or -1 on an error (logged).
  // Blocks without a limit while the peer takes nothing.
  int _Write(const void* buf, unsigned int len) override;

 private:
  TARNWICK_LOCAL void InitSSL();
  TARNWICK_LOCAL int Handshake();

  struct ssl_ctx_st* m_pSSLCtx;
  struct ssl_st* m_pSSL;
};

#endif  // TARNWICK_NET_SSLSOCKET_H_
