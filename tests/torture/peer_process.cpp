#include "tests/torture/peer_process.h"

#include <cstdio>

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

// Clients wait for longer.
constexpr int kLimitSeconds = 1;

bool Contains(const std::string& text, const char* part) {
  return text.find(part) != std::string::npos;
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

std::string ResponseTo(const std::string& request) {
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

void ServeRequest(ServerConnection& connection, unsigned /*number*/) {
  std::string head;
  std::string body;
  if (!connection.Open() || !connection.ReadRequest(&head, &body)) return;
  if (Contains(head, "/upload") && !connection.ReadUntil(kUploadEnd, &body)) return;
  if (connection.Write(ResponseTo(head + body))) connection.Notify();
}

}  // namespace

std::string LengthResponse() {
  return WithLength("text/plain", Body());
}

PeerProcess::PeerProcess(PeerKind kind) {
  if (kind == PeerKind::kNone) return;
  if (kind == PeerKind::kTls) identity_ = std::make_unique<TlsIdentity>(TlsOptions());
  const ServedPort served = {ServeRequest, identity_.get(), kLimitSeconds};
  server_ = std::make_unique<ServerProcess>(std::vector<ServedPort>{served});
}
