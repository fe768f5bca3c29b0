#include "tests/support/peer_connection.h"

#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

void Transcript::AddReceived(const std::string& bytes) {
  std::lock_guard<std::mutex> lock(mutex_);
  received_ += bytes;
}

void Transcript::AddRecord(size_t size) {
  std::lock_guard<std::mutex> lock(mutex_);
  records_.push_back(size);
}

std::string Transcript::Received() const {
  std::lock_guard<std::mutex> lock(mutex_);
  return received_;
}

std::vector<size_t> Transcript::Records() const {
  std::lock_guard<std::mutex> lock(mutex_);
  return records_;
}

const char* ReadName(PeerConnection::Read read) {
  switch (read) {
    case PeerConnection::Read::kData:
      return "data";
    case PeerConnection::Read::kEof:
      return "end of stream";
    case PeerConnection::Read::kReset:
      return "reset";
    case PeerConnection::Read::kTimeout:
      return "deadline passed";
    case PeerConnection::Read::kError:
      break;
  }
  return "error";
}

PeerConnection::PeerConnection(int fd, Transcript* transcript, std::function<bool()> stopped)
    : transcript_(transcript), fd_(fd), stopped_(std::move(stopped)), deadline_(Clock::now()) {}

PeerConnection::~PeerConnection() {
  CloseRaw();
}

bool PeerConnection::WaitFor(short events) {
  while (!DeadlinePassed()) {
    pollfd waiting = {fd_, events, 0};
    if (poll(&waiting, 1, 20) > 0) return true;
  }
  return false;
}

PeerConnection::Read PeerConnection::ReadMore() {
  std::string bytes;
  const Read read = ReadDecoded(&bytes);
  transcript_->AddReceived(bytes);
  pending_ += bytes;
  return read;
}

PeerConnection::Read PeerConnection::ReadDecoded(std::string* bytes) {
  return ReadRaw(bytes);
}

PeerConnection::Read PeerConnection::ReadRaw(std::string* bytes) {
  char buf[65536];
  for (;;) {
    const ssize_t n = recv(fd_, buf, sizeof(buf), MSG_DONTWAIT);
    if (n == 0) return Read::kEof;
    if (n > 0) {
      bytes->append(buf, static_cast<size_t>(n));
      return Read::kData;
    }
    if (errno == ECONNRESET) return Read::kReset;
    if (errno != EAGAIN && errno != EINTR) {
      error_ = strerror(errno);
      return Read::kError;
    }
    if (!WaitFor(POLLIN)) return Read::kTimeout;
  }
}

bool PeerConnection::SendRaw(const std::string& bytes) {
  for (size_t sent = 0; sent < bytes.size();) {
    const ssize_t n =
        send(fd_, bytes.data() + sent, bytes.size() - sent, MSG_DONTWAIT | MSG_NOSIGNAL);
    if (n > 0) {
      sent += static_cast<size_t>(n);
    } else if (errno != EAGAIN && errno != EINTR) {
      error_ = strerror(errno);
      return false;
    } else if (!WaitFor(POLLOUT)) {
      error_ = "deadline passed";
      return false;
    }
  }
  return true;
}

bool PeerConnection::Write(const std::string& bytes) {
  return SendRaw(bytes);
}

bool PeerConnection::Handshake(std::string*) {
  return true;
}

bool PeerConnection::SendRecordByteByByte(const std::string&, std::string* error) {
  *error = "the connection is not a TLS one";
  return false;
}

void PeerConnection::TakeArrived() {
  const Clock::time_point deadline = deadline_;
  SetDeadline(Clock::now());
  while (IsOpen() && ReadMore() == Read::kData) {
  }
  SetDeadline(deadline);
}

void PeerConnection::Close() {
  TakeArrived();  // bytes left unread would turn the close into a reset
  CloseRaw();
}

void PeerConnection::CloseRaw() {
  if (fd_ >= 0) close(fd_);
  fd_ = -1;
}

void PeerConnection::Reset() {
  const linger at_once = {1, 0};
  setsockopt(fd_, SOL_SOCKET, SO_LINGER, &at_once, sizeof(at_once));
  CloseRaw();
}

void PeerConnection::ShutdownWrite() {
  shutdown(fd_, SHUT_WR);
}
