// Sockets whose inside the tests can see, and connections without a network.
#ifndef TARNWICK_TESTS_NET_NET_TEST_UTIL_H_
#define TARNWICK_TESTS_NET_NET_TEST_UTIL_H_

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "tarnwick/net/sslsocket.h"
#include "tarnwick/net/twsocket.h"
#include "tests/support/log_capture.h"

// A socket with its fields in the open.
template <typename Base>
class Exposed : public Base {
 public:
  using Base::Base;
  using Base::m_bBuffered;
  using Base::m_bConnected;
  using Base::m_bEOF;
  using Base::m_port;
  using Base::m_readBuf;
  using Base::m_readLen;
  using Base::m_readPos;
  using Base::m_sockFd;
  using Base::m_srcAddr;
  using Base::m_strHost;
  using Base::m_timeout;

  // Puts unread bytes into the read-ahead buffer.
  void Buffer(const std::string& bytes, int pos = 0) {
    bytes.copy(m_readBuf + pos, bytes.size());
    m_readPos = pos;
    m_readLen = static_cast<int>(bytes.size());
  }

  std::string Unread() const {
    return std::string(m_readBuf + m_readPos, static_cast<size_t>(m_readLen));
  }
};

using ExposedSocket = Exposed<TWSocket>;
using ExposedTlsSocket = Exposed<SSLSocket>;

// A socket that is connected to the test itself. Its own descriptor is closed by the socket.
class PairedSocket : public ExposedSocket {
 public:
  PairedSocket(int timeout, bool buffered) : ExposedSocket("pair", 0, timeout, buffered) {
    int ends[2] = {-1, -1};
    EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
    m_sockFd = ends[0];
    peer_ = ends[1];
    m_bConnected = true;
    PostConnect();
  }
  ~PairedSocket() override { ClosePeer(); }

  int Peer() const { return peer_; }

  void ClosePeer() {
    if (peer_ >= 0) close(peer_);
    peer_ = -1;
  }

  void PeerSends(const std::string& bytes) {
    EXPECT_EQ(send(peer_, bytes.data(), bytes.size(), MSG_NOSIGNAL),
              static_cast<ssize_t>(bytes.size()));
  }

  // What has come to the peer up to now.
  std::string PeerReceives() {
    std::string all;
    char buf[4096];
    for (ssize_t n; (n = recv(peer_, buf, sizeof(buf), MSG_DONTWAIT)) > 0;) {
      all.append(buf, static_cast<size_t>(n));
    }
    return all;
  }

  // Sends until the connection takes no more.
  void FillUp() {
    const std::string block(4096, 'f');
    while (send(m_sockFd, block.data(), block.size(), MSG_NOSIGNAL | MSG_DONTWAIT) > 0) {
    }
    while (send(m_sockFd, block.data(), 1, MSG_NOSIGNAL | MSG_DONTWAIT) > 0) {
    }
  }

 private:
  int peer_ = -1;
};

// One answer of a scripted _Read or _Write.
struct IoResult {
  int result;
  int error;
  std::string bytes;
};

inline IoResult Returns(const std::string& bytes) {
  return {static_cast<int>(bytes.size()), 0, bytes};
}
inline IoResult Fails(int error) {
  return {-1, error, ""};
}
inline IoResult Ends() {
  return {0, 0, ""};
}

// `count` times the same answer.
inline std::vector<IoResult> Times(size_t count, const IoResult& answer) {
  return std::vector<IoResult>(count, answer);
}

// Bytes of which each tells its place.
inline std::string Pattern(size_t count, size_t from = 0) {
  std::string bytes;
  for (size_t i = from; i < from + count; ++i) {
    bytes += static_cast<char>('!' + (i * 7 + i / 90) % 90);
  }
  return bytes;
}

// A connected socket whose waits, reads and writes are scripted. It records their order.
class ScriptedSocket : public ExposedSocket {
 public:
  static constexpr int kFd = 7777;

  ScriptedSocket(bool buffered, std::vector<IoResult> reads)
      : ExposedSocket("script", 0, 5, buffered), reads_(std::move(reads)) {
    m_sockFd = kFd;
    m_bConnected = true;
  }
  ~ScriptedSocket() override { m_sockFd = -1; }

  // Makes the n-th wait, counted from 1, give `result`; the others are positive.
  void AnswerWait(size_t n, int result) { waits_.emplace_back(n, result); }
  void AnswerWrite(IoResult answer) { write_ = std::move(answer); }

  int DoSelect(SELECT_TYPE type) override {
    calls.emplace_back(type == SELECT_READ ? "wait to read" : "wait to write");
    ++wait_count_;
    for (const auto& [n, result] : waits_) {
      if (n == wait_count_) return result;
    }
    return 1;
  }

  int _Read(void* buf, unsigned int len) override {
    calls.push_back("read " + std::to_string(len));
    if (next_read_ == reads_.size()) {
      ADD_FAILURE() << "a read that the script does not have";
      return 0;
    }
    const IoResult& answer = reads_[next_read_++];
    EXPECT_LE(answer.bytes.size(), len) << "the script gives more than was asked for";
    answer.bytes.copy(static_cast<char*>(buf), len);
    errno = answer.error;
    return answer.result;
  }

  int _Write(const void* buf, unsigned int len) override {
    calls.push_back("write " + std::string(static_cast<const char*>(buf), len));
    errno = write_.error;
    return write_.result;
  }

  bool ScriptEnded() const { return next_read_ == reads_.size(); }

  std::vector<std::string> calls;

 private:
  std::vector<IoResult> reads_;
  size_t next_read_ = 0;
  std::vector<std::pair<size_t, int>> waits_;
  size_t wait_count_ = 0;
  IoResult write_ = {0, 0, ""};
};

// The result of a read and the bytes that it delivered.
struct Delivered {
  int result;
  std::string bytes;
};

inline bool operator==(const Delivered& a, const Delivered& b) {
  return a.result == b.result && a.bytes == b.bytes;
}

inline std::ostream& operator<<(std::ostream& out, const Delivered& read) {
  return out << read.result << ", " << ::testing::PrintToString(read.bytes.substr(0, 200));
}

// What ReadData and ReadToLineEnd give.
inline Delivered ReadSome(TWSocket& socket, size_t len) {
  std::string buf(len, '\0');
  const int result = socket.ReadData(buf.data(), static_cast<int>(len));
  const int error = errno;
  buf.resize(result > 0 ? static_cast<size_t>(result) : 0);
  errno = error;
  return {result, buf};
}

inline Delivered ReadLine(TWSocket& socket, size_t len = 128) {
  std::string buf(len, '#');
  const int result = socket.ReadToLineEnd(buf.data(), static_cast<int>(len));
  return {result, result >= 0 ? std::string(buf.c_str()) : ""};
}

inline std::string Fd(const TWSocket& socket) {
  return std::to_string(static_cast<const ExposedSocket&>(socket).m_sockFd);
}

inline bool IsNonBlocking(int fd) {
  return (fcntl(fd, F_GETFL) & O_NONBLOCK) != 0;
}

inline bool IsOpenFd(int fd) {
  return fcntl(fd, F_GETFD) != -1;
}

class Stopwatch {
 public:
  double Seconds() const {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
  }

 private:
  std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
};

// Sends the process a signal every 50 milliseconds. Its handler does nothing and does not restart
// system calls.
class SignalStorm {
 public:
  SignalStorm() {
    struct sigaction action = {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, &before_);
    const struct itimerval often = {{0, 50000}, {0, 50000}};
    setitimer(ITIMER_REAL, &often, nullptr);
  }
  ~SignalStorm() {
    const struct itimerval never = {};
    setitimer(ITIMER_REAL, &never, nullptr);
    sigaction(SIGALRM, &before_, nullptr);
  }
  SignalStorm(const SignalStorm&) = delete;
  SignalStorm& operator=(const SignalStorm&) = delete;

 private:
  struct sigaction before_ = {};
};

// The value of a socket option that is a number.
inline int SocketOption(int fd, int level, int name) {
  int value = -1;
  socklen_t length = sizeof(value);
  EXPECT_EQ(getsockopt(fd, level, name, &value, &length), 0);
  return value;
}

// A log line of the two sources.
inline auto SocketLine(const char* level, const char* function, const std::string& message) {
  return IsLog("socket", level, "twsocket", function, message);
}
inline auto TlsLine(const char* level, const char* function, const std::string& message) {
  return IsLog("socket", level, "sslsocket", function, message);
}

#endif  // TARNWICK_TESTS_NET_NET_TEST_UTIL_H_
