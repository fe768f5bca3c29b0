// A server on 127.0.0.1 that plays a script.
//
//   ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\n\r\nbody")});
//   TWHttpClient client("127.0.0.1", peer.Port(), ...);
//   ...
//   EXPECT_EQ(peer.Received(0), "GET / HTTP/1.1\r\n...");
//
// The connections are served one after the other, each by its own script:
//
//   ScriptedPeer peer({{ExpectUntil("\r\n"), Send("first\n"), Reset()},
//                      {Send("second\n"), ExpectEof()}});
//
// The peer fails the test by itself, when it ends, for a step that could not be played or was not
// reached in time, a connection that never came, and a connection for which there is no script. A
// connection that its script leaves open is closed when the peer ends.
#ifndef TARNWICK_TESTS_SUPPORT_SCRIPTED_PEER_H_
#define TARNWICK_TESTS_SUPPORT_SCRIPTED_PEER_H_

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "tests/support/flag.h"
#include "tests/support/peer_connection.h"
#include "tests/support/peer_steps.h"
#include "tests/support/ports.h"

struct PeerOptions {
  int backlog = 16;
  int receive_buffer = 0;                     // SO_RCVBUF in bytes; 0 leaves the system's
  std::chrono::milliseconds deadline{10000};  // of each step
  bool repeat = false;                        // see RepeatingPeer
};

// Threads: the test's thread makes it and asks it; it plays on a thread of its own.
class ScriptedPeer {
 public:
  explicit ScriptedPeer(std::vector<Script> connections, PeerOptions options = {});
  virtual ~ScriptedPeer();

  int Port() const { return port_; }

  // All that connection `i` (from 0) sent, decoded; waits for the end of its script first.
  std::string Received(size_t i);

  // The connections accepted so far.
  size_t Connections() const;

  // Waits for the scripts to end and reports what went wrong. The destructor calls it. What the
  // client does later is not looked at, so a script that waits for the client's close needs the
  // client closed before.
  void Finish();

 protected:
  using Connect = std::function<std::unique_ptr<PeerConnection>(int fd, Transcript*,
                                                                std::function<bool()> stopped)>;
  ScriptedPeer(std::vector<Script> connections, PeerOptions options, Connect connect);

  // The sizes of the records that connection `i` sent; see TlsScriptedPeer.
  std::vector<size_t> Records(size_t i);

 private:
  void Listen();
  void Run();
  void RepeatTheScript();
  int Accept();
  void RefuseUnexpected();
  void Play(size_t i, PeerConnection& peer);
  bool PlayStep(size_t i, const Step& step, PeerConnection& peer);
  void Fail(const std::string& message);
  void WaitForScript(size_t i);

  const std::vector<Script> scripts_;
  const PeerOptions options_;
  const Connect connect_;
  int listener_ = -1;
  int port_ = 0;
  std::vector<std::unique_ptr<Transcript>> transcripts_;
  std::vector<std::unique_ptr<PeerConnection>> open_;
  std::atomic<bool> stopped_{false};
  bool finished_ = false;

  mutable std::mutex mutex_;
  std::condition_variable progress_;
  size_t accepted_ = 0;
  size_t ended_ = 0;
  std::vector<std::string> failures_;
  Flag running_;
  std::thread thread_;
};

// Plays one script for each of any number of connections. For the tests in which calls fail: a
// client may break off at any step, and no step or missing connection fails the test.
class RepeatingPeer : public ScriptedPeer {
 public:
  explicit RepeatingPeer(Script script) : ScriptedPeer({std::move(script)}, Options()) {}

 private:
  static PeerOptions Options() {
    PeerOptions options;
    options.backlog = 64;
    options.repeat = true;
    return options;
  }
};

#endif  // TARNWICK_TESTS_SUPPORT_SCRIPTED_PEER_H_
