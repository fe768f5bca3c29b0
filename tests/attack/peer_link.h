// One connection of the hostile server.
#ifndef TARNWICK_TESTS_ATTACK_PEER_LINK_H_
#define TARNWICK_TESTS_ATTACK_PEER_LINK_H_

#include <openssl/ssl.h>

#include <string>
#include <vector>

#include "tests/attack/exchange.h"

// Plain, or TLS over memory, so that its records can be cut. Every wait ends when the client's call
// is over, which `over` becomes readable for, and after a limit.
// Threads: one thread.
class PeerLink {
 public:
  // Owns `fd`. `context` is null for a plain connection.
  PeerLink(int fd, int over, SSL_CTX* context, const TlsPlan& plan);
  ~PeerLink();
  PeerLink(const PeerLink&) = delete;
  PeerLink& operator=(const PeerLink&) = delete;

  // Makes the handshake, with its fault when `faulty`. False when it has failed.
  bool Open(bool faulty);

  // Waits for more of what the client sends and adds it to Received. False at the end of the
  // stream, when the call is over and after `limit_ms`.
  bool Read(int limit_ms);

  const std::string& Received() const { return received_; }

  // The segments in which a response travels: pieces of it, or of its records.
  std::vector<std::string> Segments(const Delivery& delivery);

  bool Send(const std::string& bytes);

  // Waits; what the client sends meanwhile is received. False when the client has gone.
  bool Pause(unsigned milliseconds);

  // Ends the connection; for kKeep nothing happens.
  void Finish(End end);

 private:
  enum class Event { kReadable, kOver, kTimeout };
  Event WaitFor(short events, int limit_ms) const;
  bool Receive();
  void Decode();
  std::string TakeOutput();
  bool SendFaulty(const std::string& bytes);
  bool Spoil();
  void Close();

  int fd_;
  const int over_;
  const TlsPlan& plan_;
  SSL* ssl_ = nullptr;
  BIO* from_client_ = nullptr;
  BIO* to_client_ = nullptr;
  bool faulty_ = false;
  bool spoilt_ = false;  // the fault has been sent
  size_t handshake_sent_ = 0;
  std::string received_;
};

#endif  // TARNWICK_TESTS_ATTACK_PEER_LINK_H_
