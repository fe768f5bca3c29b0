#include "tests/support/scripted_peer.h"

#include <gtest/gtest.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>

namespace {

std::unique_ptr<PeerConnection> ConnectPlain(int fd, Transcript* transcript,
                                             std::function<bool()> stopped) {
  return std::make_unique<PeerConnection>(fd, transcript, std::move(stopped));
}

}  // namespace

ScriptedPeer::ScriptedPeer(std::vector<Script> connections, PeerOptions options)
    : ScriptedPeer(std::move(connections), options, ConnectPlain) {}

ScriptedPeer::ScriptedPeer(std::vector<Script> connections, PeerOptions options, Connect connect)
    : scripts_(std::move(connections)), options_(options), connect_(std::move(connect)) {
  for (size_t i = 0; i < scripts_.size(); ++i) {
    transcripts_.push_back(std::make_unique<Transcript>());
  }
  Listen();
  thread_ = std::thread([this] { Run(); });
  // A test may fork next, and its child would keep for ever a lock of the allocator that the new
  // thread holds just then. From here on the thread sleeps until a connection comes.
  running_.Wait();
}

ScriptedPeer::~ScriptedPeer() {
  Finish();
}

void ScriptedPeer::Listen() {
  listener_ = BindLoopback(&port_);
  if (options_.receive_buffer > 0) {
    setsockopt(listener_, SOL_SOCKET, SO_RCVBUF, &options_.receive_buffer, sizeof(int));
  }
  if (listen(listener_, options_.backlog) != 0) ADD_FAILURE() << "the peer cannot listen";
}

void ScriptedPeer::Finish() {
  if (finished_) return;
  finished_ = true;
  stopped_ = true;
  thread_.join();
  open_.clear();
  close(listener_);
  for (const std::string& failure : failures_) ADD_FAILURE() << failure;
}

size_t ScriptedPeer::Connections() const {
  std::lock_guard<std::mutex> lock(mutex_);
  return accepted_;
}

void ScriptedPeer::WaitForScript(size_t i) {
  std::unique_lock<std::mutex> lock(mutex_);
  const auto limit = std::chrono::system_clock::now() + 2 * options_.deadline;
  if (i < scripts_.size() &&
      progress_.wait_until(lock, limit, [&] { return ended_ > i || finished_; })) {
    return;
  }
  ADD_FAILURE() << "the script of connection " << i << " has not ended";
}

std::string ScriptedPeer::Received(size_t i) {
  WaitForScript(i);
  return i < transcripts_.size() ? transcripts_[i]->Received() : "";
}

std::vector<size_t> ScriptedPeer::Records(size_t i) {
  WaitForScript(i);
  return i < transcripts_.size() ? transcripts_[i]->Records() : std::vector<size_t>();
}

void ScriptedPeer::Fail(const std::string& message) {
  std::lock_guard<std::mutex> lock(mutex_);
  failures_.push_back(message);
}

// The thread.

void ScriptedPeer::Run() {
  running_.Set();
  if (options_.repeat) {
    RepeatTheScript();
    return;
  }
  for (size_t i = 0; i < scripts_.size(); ++i) {
    const int fd = Accept();
    if (fd < 0) {
      Fail("connection " + std::to_string(i) + " never came");
      break;
    }
    auto peer = connect_(fd, transcripts_[i].get(), [this] { return stopped_.load(); });
    Play(i, *peer);
    if (peer->IsOpen()) open_.push_back(std::move(peer));
    std::lock_guard<std::mutex> lock(mutex_);
    ++ended_;
    progress_.notify_all();
  }
  RefuseUnexpected();
}

void ScriptedPeer::RepeatTheScript() {
  for (int fd; (fd = Accept()) >= 0;) {
    Transcript unread;
    const auto peer = connect_(fd, &unread, [this] { return stopped_.load(); });
    Play(0, *peer);
  }
  failures_.clear();  // a client may break off at any step
}

// Waits for the next connection; -1 when the test has ended without one.
int ScriptedPeer::Accept() {
  for (;;) {
    const bool last_look = stopped_;
    pollfd waiting = {listener_, POLLIN, 0};
    if (poll(&waiting, 1, last_look ? 0 : 2) > 0) break;
    if (last_look) return -1;
  }
  const int fd = accept4(listener_, nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC);
  const int on = 1;
  setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof(on));
  std::lock_guard<std::mutex> lock(mutex_);
  ++accepted_;
  return fd;
}

void ScriptedPeer::RefuseUnexpected() {
  for (int fd; (fd = Accept()) >= 0; close(fd))
    Fail("a connection came for which there is no script");
}

void ScriptedPeer::Play(size_t i, PeerConnection& peer) {
  bool handshake_made = false;
  for (const Step& step : scripts_[i]) {
    peer.SetDeadline(PeerConnection::Clock::now() + options_.deadline);
    std::string error;
    if (step.needs_handshake && !handshake_made) {
      if (!peer.Handshake(&error)) {
        Fail("connection " + std::to_string(i) + ", TLS handshake: " + error);
        return;
      }
      handshake_made = true;
    }
    if (!PlayStep(i, step, peer)) return;
  }
}

bool ScriptedPeer::PlayStep(size_t i, const Step& step, PeerConnection& peer) {
  std::string error;
  if (!peer.IsOpen()) {
    Fail("connection " + std::to_string(i) + ": " + step.name + " comes after the close");
    return false;
  }
  if (step.play(peer, &error)) return true;
  Fail("connection " + std::to_string(i) + ", step " + step.name + ": " + error);
  return false;
}
