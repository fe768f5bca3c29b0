// One accepted connection of a scripted peer, as the script's steps see it.
#ifndef TARNWICK_TESTS_SUPPORT_PEER_CONNECTION_H_
#define TARNWICK_TESTS_SUPPORT_PEER_CONNECTION_H_

#include <sys/types.h>

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

// What a connection carried; read by the test while the peer's thread writes it.
class Transcript {
 public:
  void AddReceived(const std::string& bytes);
  void AddRecord(size_t size);
  std::string Received() const;
  std::vector<size_t> Records() const;

 private:
  mutable std::mutex mutex_;
  std::string received_;
  std::vector<size_t> records_;
};

// Threads: the peer's thread alone.
class PeerConnection {
 public:
  using Clock = std::chrono::steady_clock;
  enum class Read { kData, kEof, kReset, kTimeout, kError };

  // Owns `fd`, a non-blocking TCP socket. `stopped` says that the test waits for the peer's end.
  PeerConnection(int fd, Transcript* transcript, std::function<bool()> stopped);
  virtual ~PeerConnection();
  PeerConnection(const PeerConnection&) = delete;
  PeerConnection& operator=(const PeerConnection&) = delete;

  void SetDeadline(Clock::time_point deadline) { deadline_ = deadline; }
  bool DeadlinePassed() const { return Clock::now() >= deadline_; }
  bool Stopped() const { return stopped_(); }

  // Waits for bytes and appends them to Pending().
  Read ReadMore();

  // Received bytes that no step has taken yet.
  std::string& Pending() { return pending_; }

  // The layer under TLS, when there is one; each fails the step when the connection is plain.
  virtual bool Handshake(std::string* error);
  virtual bool SendRecordByteByByte(const std::string& bytes, std::string* error);
  virtual bool SawCloseNotice() const { return false; }
  virtual void SendCloseNotice() {}

  // Sends all bytes; false when the client closed or the deadline passed.
  virtual bool Write(const std::string& bytes);

  // Ends the connection as the protocol asks: over TLS with a close notice.
  virtual void Close();

  bool SendRaw(const std::string& bytes);
  Read ReadRaw(std::string* bytes);
  void CloseRaw();
  void Reset();
  void ShutdownWrite();
  bool IsOpen() const { return fd_ >= 0; }

  // Records what has arrived, without waiting.
  void TakeArrived();

  const std::string& ErrorText() const { return error_; }

 protected:
  // Reads decoded bytes; the plain connection's are the raw ones.
  virtual Read ReadDecoded(std::string* bytes);
  bool WaitFor(short events);

  Transcript* transcript_;
  std::string error_;

 private:
  int fd_;
  std::function<bool()> stopped_;
  Clock::time_point deadline_;
  std::string pending_;
};

const char* ReadName(PeerConnection::Read read);

#endif  // TARNWICK_TESTS_SUPPORT_PEER_CONNECTION_H_
