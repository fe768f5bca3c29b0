// The hostile server of one client: a thread with a port of its own, which plays one exchange after
// the other.
#ifndef TARNWICK_TESTS_ATTACK_PEER_THREAD_H_
#define TARNWICK_TESTS_ATTACK_PEER_THREAD_H_

#include <openssl/ssl.h>

#include <string>
#include <thread>
#include <vector>

#include "tests/attack/exchange.h"
#include "tests/support/tls_identity.h"

// The TLS contexts that all servers share.
class PeerContexts {
 public:
  PeerContexts();
  ~PeerContexts();
  PeerContexts(const PeerContexts&) = delete;
  PeerContexts& operator=(const PeerContexts&) = delete;

  SSL_CTX* For(const TlsPlan& plan) const;
  const std::string& CaFile() const { return identity_.CaFile(); }

 private:
  TlsIdentity identity_;
  TlsIdentity stranger_;
  SSL_CTX* trusted_;
  SSL_CTX* http2_;
  SSL_CTX* strange_;
};

// What happened to one exchange, as the server saw it.
struct PeerRecord {
  std::vector<std::string> connections;  // the bytes that came on each, decoded
  int last_delivery = -1;                // the last one that was begun
  bool whole = false;                    // all of its bytes have been sent, and an end in order
  int deliveries = 0;
  bool spoke_http2 = false;
  double sending = 0;               // seconds, pauses between pieces included
  double without_processor = 0;     // seconds; see SecondsWithoutProcessor
  std::vector<unsigned> stalls_ms;  // the pauses that were begun, as planned
};

// Threads: the client's thread alone calls Begin and Finish, in turn.
class PeerThread {
 public:
  explicit PeerThread(const PeerContexts& contexts);
  ~PeerThread();
  PeerThread(const PeerThread&) = delete;
  PeerThread& operator=(const PeerThread&) = delete;

  int Port() const { return port_; }

  // Serves the connections of an exchange, until Finish. `exchange` must live until then.
  void Begin(const HostileExchange& exchange);
  PeerRecord Finish();

 private:
  void Run();
  void Play();

  const PeerContexts& contexts_;
  int port_ = 0;
  int listener_ = -1;
  int begin_ = -1;  // eventfds: an exchange begins; the client's call is over; the record is ready
  int over_ = -1;
  int ready_ = -1;
  const HostileExchange* exchange_ = nullptr;  // null: the thread ends
  PeerRecord record_;
  std::thread thread_;
};

#endif  // TARNWICK_TESTS_ATTACK_PEER_THREAD_H_
