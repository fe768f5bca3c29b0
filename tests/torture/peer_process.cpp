#include "tests/torture/peer_process.h"

#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "tests/support/ports.h"

const std::string& Body() {
  static const std::string body = std::string(9000, 'b') + "\nend";  // more than a piece of 8,192
  return body;
}

// Nested so deeply that the reader asks for the thread's stack.
const char kJsonBody[] =
    "{\"success\": true, \"list\": [1, 2.5, \"three\", {\"four\": null}],"
    " \"deep\": [[[[[[[[[[[[[[[[[[[[5]]]]]]]]]]]]]]]]]]]]}";
const char kXmlBody[] = "<?xml version=\"1.0\"?>\n<r><a n=\"1\">text</a><b/></r>\n";

namespace {

// Longer than no client waits for an answer to half a request.
constexpr int kPatienceSeconds = 1;

// A connection, plain or TLS.
class Line {
 public:
  Line(int fd, SSL_CTX* context) : fd_(fd), ssl_(context != nullptr ? SSL_new(context) : nullptr) {
    const timeval patience = {kPatienceSeconds, 0};
    setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof(patience));
    setsockopt(fd, SOL_SOCKET, SO_SNDTIMEO, &patience, sizeof(patience));
    if (ssl_ != nullptr) SSL_set_fd(ssl_, fd);
  }

  ~Line() {
    SSL_free(ssl_);
    close(fd_);
  }

  Line(const Line&) = delete;
  Line& operator=(const Line&) = delete;

  bool Open() { return ssl_ == nullptr || SSL_accept(ssl_) == 1; }

  // Appends what has come. Results: false at the end.
  bool Read(std::string* text) {
    char buf[16384];
    const long count =
        ssl_ != nullptr ? SSL_read(ssl_, buf, sizeof(buf)) : recv(fd_, buf, sizeof(buf), 0);
    if (count > 0) text->append(buf, static_cast<size_t>(count));
    return count > 0;
  }

  void Send(const std::string& text) {
    if (ssl_ == nullptr) {
      send(fd_, text.data(), text.size(), MSG_NOSIGNAL);
      return;
    }
    if (SSL_write(ssl_, text.data(), static_cast<int>(text.size())) > 0) SSL_shutdown(ssl_);
  }

 private:
  int fd_;
  SSL* ssl_;
};

bool Contains(const std::string& text, const char* part) {
  return text.find(part) != std::string::npos;
}

bool IsWhole(const std::string& request) {
  const size_t head = request.find("\r\n\r\n");
  if (head == std::string::npos) return false;
  if (Contains(request, "/upload")) return Contains(request, kUploadEnd);
  const size_t length = request.find("Content-Length: ");
  if (length > head) return true;
  return request.size() >= head + 4 + strtoul(request.c_str() + length + 16, nullptr, 10);
}

std::string WithLength(const std::string& type, const std::string& body) {
  return "HTTP/1.1 200 OK\r\nContent-Type: " + type + "\r\nSet-Cookie: id=42; Path=/\r\n" +
         "Content-Length: " + std::to_string(body.size()) + "\r\nConnection: close\r\n\r\n" + body;
}

std::string Refusal(const char* challenge) {
  return std::string("HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: ") + challenge +
         "\r\nContent-Length: 2\r\nConnection: close\r\n\r\nno";
}

std::string Chunk(const std::string& data, const char* extension) {
  char size[16];
  snprintf(size, sizeof(size), "%zx", data.size());
  return size + std::string(extension) + "\r\n" + data + "\r\n";
}

std::string Chunked() {
  return "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\nConnection: close\r\n\r\n" +
         Chunk(Body().substr(0, 4), ";x=y") + Chunk(Body().substr(4), "") + "0\r\n\r\n";
}

// The documents that the operations send end so.
bool LacksItsEnd(const std::string& request) {
  return Contains(request, "/whole/") && !Contains(request, "</r>");
}

std::string ReplyTo(const std::string& request) {
  const std::string path = request.substr(0, request.find("\r\n"));
  if (Contains(path, "digest") && !Contains(request, "Authorization: Digest")) {
    return Refusal("Digest realm=\"cam\", nonce=\"abcdef\", qop=\"auth\", opaque=\"xyz\"");
  }
  if (Contains(path, "basic") && !Contains(request, "Authorization: Basic")) {
    return Refusal("Basic realm=\"cam\"");
  }
  if (LacksItsEnd(request)) return "HTTP/1.1 400 Bad Request\r\nContent-Length: 0\r\n\r\n";
  if (Contains(path, "chunked")) return Chunked();
  if (Contains(path, "json")) return WithLength("application/json", kJsonBody);
  if (Contains(path, "xml")) return WithLength("text/xml", kXmlBody);
  if (Contains(path, "length")) return LengthResponse();
  return "HTTP/1.1 200 OK\r\nContent-Type: text/plain\r\nSet-Cookie: id=42; Path=/\r\n"
         "Content-Range: bytes 0-9/10\r\n\r\n" +
         Body();
}

void Answer(Line* line) {
  if (!line->Open()) return;
  std::string request;
  while (!IsWhole(request)) {
    if (!line->Read(&request)) return;
  }
  line->Send(ReplyTo(request));
}

}  // namespace

std::string LengthResponse() {
  return WithLength("text/plain", Body());
}

PeerProcess::PeerProcess(Peer kind) {
  if (kind == Peer::kNone) return;
  if (kind == Peer::kTls) identity_ = std::make_unique<TlsIdentity>(TlsOptions());
  const int listener = BindLoopback(&port_);
  listen(listener, 64);
  pid_ = fork();
  if (pid_ == 0) Serve(listener);
  close(listener);
}

PeerProcess::~PeerProcess() {
  if (pid_ <= 0) return;
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
}

void PeerProcess::Serve(int listener) const {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  signal(SIGPIPE, SIG_IGN);
  SSL_CTX* const context = identity_ ? identity_->NewServerContext() : nullptr;
  for (;;) {
    const int fd = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
    if (fd < 0) _exit(0);
    Line line(fd, context);
    Answer(&line);
  }
}
