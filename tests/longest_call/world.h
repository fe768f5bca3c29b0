// What the run changes of its sandbox, so that the system's own limits are met in seconds.
#ifndef TARNWICK_TESTS_LONGEST_CALL_WORLD_H_
#define TARNWICK_TESTS_LONGEST_CALL_WORLD_H_

#include <string>
#include <thread>

// A name server that never answers, asked twice for a second each.
// REQUIRES: no other thread runs yet.
class SilentNameServer {
 public:
  SilentNameServer();
  ~SilentNameServer();
  SilentNameServer(const SilentNameServer&) = delete;
  SilentNameServer& operator=(const SilentNameServer&) = delete;

 private:
  int fd_;
};

// A connect gives up after three seconds: one repetition, where six are usual.
bool RepeatConnectsOnce();

// Stands between a client and a server and hands the server's bytes on one at a time, each just in
// time for a wait of a second. What comes first goes at full speed: it is the handshake.
class SlowRelay {
 public:
  explicit SlowRelay(int serverPort);
  ~SlowRelay();
  SlowRelay(const SlowRelay&) = delete;
  SlowRelay& operator=(const SlowRelay&) = delete;

  int Port() const { return port_; }

 private:
  void Run(int serverPort);

  int port_ = 0;  // before what sets it
  int listener_;
  std::thread thread_;
};

#endif  // TARNWICK_TESTS_LONGEST_CALL_WORLD_H_
