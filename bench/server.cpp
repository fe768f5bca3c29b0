// Accepts a connection, reads one request, writes the response and closes; then the next one. Fixed
// and simple, so that it costs all contenders the same.
#include "bench/server.h"

#include <netinet/in.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>

#include "bench/contender.h"
#include "bench/exchange.h"
#include "bench/server_stream.h"
#include "bench/texts.h"

namespace {

constexpr const char* kPortVariables[] = {"TARNWICK_BENCH_PORT", "TARNWICK_BENCH_TLS_PORT"};

std::string Response(const char* status, const std::string& headers, const std::string& body) {
  return std::string("HTTP/1.1 ") + status + "\r\nServer: camera\r\n" + headers +
         "Connection: close\r\n\r\n" + body;
}

std::string Plain(const std::string& type, const std::string& body) {
  return Response(
      "200 OK",
      "Content-Type: " + type + "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n",
      body);
}

struct Request {
  std::string head;
  std::string body;

  std::string Path() const {
    const size_t begin = head.find(' ') + 1;
    return head.substr(begin, head.find(' ', begin) - begin);
  }

  // The value of a header; empty without one.
  std::string Value(const std::string& name) const {
    const char* const found = strcasestr(head.c_str(), ("\r\n" + name + ": ").c_str());
    if (found == nullptr) return "";
    const char* const begin = found + name.size() + 4;
    return std::string(begin, std::strstr(begin, "\r\n"));
  }
};

// A parameter of Digest credentials, quoted or not.
std::string Parameter(const std::string& credentials, const std::string& name) {
  for (const char before : {' ', ','}) {
    size_t begin = credentials.find(before + name + "=");
    if (begin == std::string::npos) continue;
    begin += name.size() + 2;
    if (credentials[begin] == '"')
      return credentials.substr(begin + 1, credentials.find('"', begin + 1) - begin - 1);
    return credentials.substr(begin, credentials.find(',', begin) - begin);
  }
  return "";
}

bool AreRightCredentials(const std::string& credentials, const std::string& path) {
  const std::string secret = Md5Hex(std::string(kUser) + ":" + kRealm + ":" + kPassword);
  return Parameter(credentials, "uri") == path &&
         Parameter(credentials, "response") ==
             Md5Hex(secret + ":" + kNonce + ":" + Parameter(credentials, "nc") + ":" +
                    Parameter(credentials, "cnonce") + ":auth:" + Md5Hex("GET:" + path));
}

class Server {
 public:
  void Serve(ServerStream* stream) {
    Request request;
    if (!Read(stream, &request)) return;
    const std::string* const response = ResponseTo(stream, request);
    if (response != nullptr) stream->Write(response->data(), response->size());
  }

 private:
  // Reads a request with its body, but not that of the upload.
  bool Read(ServerStream* stream, Request* request) {
    std::string bytes;
    char piece[16384];
    size_t end;
    while ((end = bytes.find("\r\n\r\n")) == std::string::npos) {
      const ssize_t count = stream->Read(piece, sizeof(piece));
      if (count <= 0) return false;
      bytes.append(piece, static_cast<size_t>(count));
    }
    request->head = bytes.substr(0, end + 2);
    request->body = bytes.substr(end + 4);
    if (request->Path() == "/upload") return true;
    const size_t length = std::strtoul(request->Value("Content-Length").c_str(), nullptr, 10);
    while (request->body.size() < length) {
      const ssize_t count = stream->Read(piece, sizeof(piece));
      if (count <= 0) return false;
      request->body.append(piece, static_cast<size_t>(count));
    }
    return true;
  }

  const std::string* ResponseTo(ServerStream* stream, const Request& request) {
    const std::string path = request.Path();
    if (path == "/digest") return ResponseToDigest(request);
    if (path == "/form") return ResponseToPost(FormPost(), request);
    if (path == "/soap") return ResponseToPost(SoapPost(), request);
    if (path == "/soap_xml") return ResponseToPost(SoapXml(), request);
    if (path == "/upload" && !Swallow(stream, request.body.size())) return nullptr;
    std::string& response = m_responses[path];
    if (response.empty()) response = Make(path);
    return &response;
  }

  // Reads the upload until all of its bytes have come.
  static bool Swallow(ServerStream* stream, size_t done) {
    static char piece[256 << 10];
    while (done < kUploadSize) {
      const ssize_t count = stream->Read(piece, sizeof(piece));
      if (count <= 0) return false;
      done += static_cast<size_t>(count);
    }
    return true;
  }

  static std::string Make(const std::string& path) {
    if (path == "/json") return Plain("application/json", JsonGet().response);
    if (path == "/upload") return Plain("text/plain", Upload().response);
    if (path.rfind("/body/", 0) == 0) {
      return Plain("application/octet-stream", BodyText(std::strtoul(&path[6], nullptr, 10)));
    }
    if (path.rfind("/chunked/", 0) == 0) {
      return Response("200 OK", "Transfer-Encoding: chunked\r\n",
                      Chunked(BodyText(std::strtoul(&path[9], nullptr, 10)), kChunkSize));
    }
    return m_refusal;
  }

  // The first request gets a challenge. Credentials are checked now and then: to check them each time
  // would be work of the server that is the same for all and hides the clients'.
  const std::string* ResponseToDigest(const Request& request) {
    static const std::string challenge =
        Response("401 Unauthorized",
                 std::string("WWW-Authenticate: Digest realm=\"") + kRealm + "\", nonce=\"" +
                     kNonce + "\", qop=\"auth\", algorithm=MD5\r\nContent-Length: 0\r\n",
                 "");
    static const std::string good = Plain("application/json", DigestGet().response);
    const std::string credentials = request.Value("Authorization");
    if (credentials.rfind("Digest ", 0) != 0) return &challenge;
    const bool checked = m_authorized++ % 64 == 0;
    return checked && !AreRightCredentials(credentials, "/digest") ? &m_refusal : &good;
  }

  const std::string* ResponseToPost(const Exchange& exchange, const Request& request) {
    std::string& response = m_responses[exchange.path];
    if (response.empty()) response = Plain(exchange.contentType, exchange.response);
    std::string& expected = m_bodies[exchange.path];
    if (expected.empty()) expected = exchange.body;
    return request.body == expected ? &response : &m_refusal;
  }

  static const std::string m_refusal;
  std::map<std::string, std::string> m_responses;
  std::map<std::string, std::string> m_bodies;  // that posts must have
  unsigned m_authorized = 0;
};

const std::string Server::m_refusal = Response("400 Bad Request", "Content-Length: 0\r\n", "");

[[noreturn]] void ServeForEver(int listener, bool tls) {
  const ServerIdentity identity(tls);
  Server server;
  for (;;) {
    const int connection = accept(listener, nullptr, nullptr);
    if (connection < 0) _exit(1);
    ServerStream stream(connection, identity);
    server.Serve(&stream);
  }
}

// A socket that listens on 127.0.0.1 and that started programs do not get.
int ListenOnLoopback(int* port) {
  const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  struct sockaddr_in address = {};
  socklen_t size = sizeof(address);
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  auto* const general = reinterpret_cast<struct sockaddr*>(&address);
  Expect(bind(listener, general, size) == 0 && listen(listener, 64) == 0, "server",
         "cannot listen");
  Expect(getsockname(listener, general, &size) == 0, "server", "has no port");
  *port = ntohs(address.sin_port);
  return listener;
}

// Results: its port.
int Start(bool tls) {
  int port = 0;
  const int listener = ListenOnLoopback(&port);
  const pid_t child = fork();
  Expect(child >= 0, "server", "cannot be started");
  if (child == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    signal(SIGPIPE, SIG_IGN);
    ServeForEver(listener, tls);
  }
  close(listener);
  return port;
}

}  // namespace

void StartServers() {
  for (const bool tls : {false, true}) {
    setenv(kPortVariables[tls ? 1 : 0], std::to_string(ServerPort(tls)).c_str(), 1);
  }
}

int ServerPort(bool tls) {
  static int ports[2] = {0, 0};
  int& port = ports[tls ? 1 : 0];
  if (port == 0) {
    const char* const text = std::getenv(kPortVariables[tls ? 1 : 0]);
    port = text != nullptr ? std::atoi(text) : Start(tls);
  }
  return port;
}
