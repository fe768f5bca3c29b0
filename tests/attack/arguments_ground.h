// What the calls of one round share: objects in any state, descriptors, files, and the findings.
#ifndef TARNWICK_TESTS_ATTACK_ARGUMENTS_GROUND_H_
#define TARNWICK_TESTS_ATTACK_ARGUMENTS_GROUND_H_

#include <atomic>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "tarnwick/http/twhttp.h"
#include "tarnwick/net/sslsocket.h"
#include "tarnwick/net/twrequestscope.h"
#include "tarnwick/utils/utils.h"
#include "tests/attack/arguments_draw.h"
#include "tests/attack/arguments_peer.h"

// A timer and its period, on which it depends whether Delay may be called.
struct PacedTimer {
  std::unique_ptr<DelayTimer> timer;
  int period = 0;
};

// A client. Init and InitSocket make a socket each time and leave the one before, so they are
// called on a client without one.
struct HeldClient {
  std::unique_ptr<TWHttpClient> client;
  bool has_socket = false;
};

class Ground {
 public:
  Ground(const ArgumentsPeer& peer, uint64_t seed);
  ~Ground();
  Ground(const Ground&) = delete;
  Ground& operator=(const Ground&) = delete;

  Draw& Drawn() { return draw_; }

  // A finding unless `right`.
  void Expect(bool right, const char* what) {
    if (!right) findings_.emplace_back(what);
  }
  const std::vector<std::string>& Findings() const { return findings_; }

  // Objects of this round; the first call makes one.
  TWSocket& Plain();
  SSLSocket& Tls();
  TWSocket& AnySocket();
  HeldClient& Client();
  PacedTimer& Timer();
  void NewPlain(bool with_arguments);
  void NewTls(bool with_arguments);
  void NewClient(bool with_arguments);
  void DropPlain() { plain_.reset(); }
  void DropTls() { tls_.reset(); }
  void DropClient() { client_ = HeldClient(); }
  // Nested scopes, of which the last one is dropped first.
  TWRequestScope& Scope();
  void NewScope();
  void DropScope() { scopes_.pop_back(); }
  void DropTimer() { timer_ = PacedTimer(); }

  // A host and a port of a peer, of nobody, or none at all.
  std::string Host();
  int Port(bool tls);

  // Descriptors of all kinds, valid or not. Those that are valid belong to the round.
  int Descriptor();
  // A file for responses: null, or one that can be written, is full, or can only be read.
  FILE* ResponseFile();
  // The path of a settings file. Nothing outside the round's folder and the settings is written.
  const char* SettingsPath();

  // For threads that are started: their argument.
  std::atomic<int>* Ended() { return &ended_; }
  void StartedThread() { ++started_; }

 private:
  int Kept(int fd);

  const ArgumentsPeer& peer_;
  Draw draw_;
  std::vector<std::string> findings_;
  std::unique_ptr<TWSocket> plain_;
  std::unique_ptr<SSLSocket> tls_;
  std::vector<FILE*> files_;
  HeldClient client_;
  PacedTimer timer_;
  std::vector<std::unique_ptr<TWRequestScope>> scopes_;
  std::vector<int> descriptors_;
  std::atomic<int> ended_{0};
  int started_ = 0;
};

#endif  // TARNWICK_TESTS_ATTACK_ARGUMENTS_GROUND_H_
