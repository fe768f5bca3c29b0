#include "tools/twhttp/fake_peer.h"

#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <system_error>

#include "tools/common/text.h"
#include "tools/twhttp/message.h"

namespace {

// Of an upload, which announces more than ever comes.
constexpr uint64_t kEndless = uint64_t{1} << 36;

uint64_t AnnouncedLength(const std::string& head) {
  for (const auto& header : SplitHeaderLines(head)) {
    if (EqualsIgnoringCase(header.first, "Content-Length")) {
      return std::strtoull(header.second.c_str(), nullptr, 10);
    }
  }
  return 0;
}

// The length of the request at the beginning of `bytes`; 0 while it is not complete.
size_t RequestLength(const std::string& bytes, bool* endless) {
  const size_t end = bytes.find("\r\n\r\n");
  if (end == std::string::npos) return 0;
  const uint64_t body = AnnouncedLength(bytes.substr(0, end));
  *endless = body >= kEndless;
  if (*endless) return end + 4;
  return bytes.size() - end - 4 >= body ? end + 4 + static_cast<size_t>(body) : 0;
}

void SendAll(int fd, const std::string& text) {
  for (size_t done = 0; done < text.size();) {
    const ssize_t count = send(fd, text.data() + done, text.size() - done, MSG_NOSIGNAL);
    if (count <= 0) return;
    done += static_cast<size_t>(count);
  }
}

}  // namespace

FakePeer::FakePeer(std::string challenge) : challenge_(std::move(challenge)) {
  address_.sin_family = AF_INET;
  address_.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  sockaddr* const address = reinterpret_cast<sockaddr*>(&address_);
  socklen_t size = sizeof(address_);
  listener_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (listener_ < 0 || bind(listener_, address, size) != 0 || listen(listener_, 1) != 0 ||
      getsockname(listener_, address, &size) != 0) {
    throw std::system_error(errno, std::generic_category(), "no peer to show the request");
  }
  thread_ = std::thread([this] { Accept(); });
}

FakePeer::~FakePeer() {
  Finish();
}

// One connection after another: no operation has two at once.
void FakePeer::Accept() {
  for (int fd; (fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0;) Serve(fd);
}

std::vector<std::string> FakePeer::Finish() {
  if (listener_ < 0) return requests_;
  shutdown(listener_, SHUT_RDWR);  // wakes the accept
  thread_.join();
  close(listener_);
  listener_ = -1;
  return requests_;
}

std::string FakePeer::NextResponse() {
  constexpr char kEmpty[] = "Content-Length: 0\r\nConnection: close\r\n\r\n";
  const std::lock_guard<std::mutex> lock(mutex_);
  if (challenge_.empty() || requests_.size() != 1)
    return std::string("HTTP/1.1 200 OK\r\n") + kEmpty;
  return "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: " + challenge_ + "\r\n" + kEmpty;
}

void FakePeer::Serve(int fd) {
  std::string bytes;
  bool endless = false;
  bool responded = false;
  char piece[65536];
  for (ssize_t count; (count = recv(fd, piece, sizeof(piece), 0)) > 0;) {
    bytes.append(piece, static_cast<size_t>(count));
    const size_t length = endless ? bytes.size() : RequestLength(bytes, &endless);
    if (length == 0) continue;
    Take(bytes.substr(0, length), endless && responded);
    bytes.erase(0, length);
    if (!responded) SendAll(fd, NextResponse());
    shutdown(fd, SHUT_WR);  // the library reads a response to the close
    responded = true;
  }
  if (!bytes.empty()) Take(bytes, false);
  close(fd);
}

void FakePeer::Take(const std::string& bytes, bool continued) {
  const std::lock_guard<std::mutex> lock(mutex_);
  if (!continued || requests_.empty()) requests_.emplace_back();
  requests_.back() += bytes;
}
