#include "fuzz/oracle/exchange.h"

#include <algorithm>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "fuzz/oracle/shared/model_body.h"

namespace {

constexpr int kOk = 0;
constexpr int kIoError = 3;
constexpr int kUnauthorized = 4;
constexpr size_t kMostOfAGet = 2047;
constexpr long kMostAtOnce = 1 << 20;

bool Stays(char c, const std::string& keep) {
  if ((c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z')) return true;
  return std::strchr("_~()*,-.", c) != nullptr || keep.find(c) != std::string::npos;
}

std::string Encode(const std::string& value, const std::string& keep) {
  std::string encoded;
  for (const char c : value) {
    char escaped[4];
    std::snprintf(escaped, sizeof(escaped), "%%%02X", static_cast<unsigned char>(c));
    if (c == ' ' || (c >= '\t' && c <= '\r')) {
      encoded += "%20";
    } else if (Stays(c, keep)) {
      encoded += c;
    } else {
      encoded += escaped;
    }
  }
  return encoded;
}

// A segment "name=value" or "&name=value". Its first character is never the "=" looked for.
std::string EncodeSegment(const std::string& segment, const std::string& keep) {
  const size_t equals = segment.find('=', 1);
  if (equals == std::string::npos) return segment;
  return segment.substr(0, equals + 1) + Encode(segment.substr(equals + 1), keep);
}

// Only an "&" after an "=" ends a segment, so "?a&b=1 2" is one of the name "a&b".
std::string EncodeQuery(const std::string& path, const std::string& keep) {
  const size_t question = path.find('?');
  if (question == std::string::npos) return path;
  std::string encoded = path.substr(0, question + 1);
  std::string rest = path.substr(question + 1);
  while (!rest.empty()) {
    const size_t equals = rest.find('=', 1);
    const size_t end = equals == std::string::npos ? equals : rest.find('&', equals + 1);
    encoded += EncodeSegment(rest.substr(0, end), keep);
    rest = end == std::string::npos ? "" : rest.substr(end);
  }
  return encoded;
}

}  // namespace

ModelClient::ModelClient(ModelSettings settings, const std::vector<Connection>& connections,
                         const std::vector<size_t>& sizes)
    : settings_(std::move(settings)),
      socket_(settings_.timeout, settings_.buffered, connections, sizes) {
  std::string* path = &settings_.credentials.path;
  path->erase(0, path->find_first_not_of('/'));
  head_.state = 0;
}

std::string ModelClient::CookieLine() const {
  return head_.cookie.empty() ? "" : "Cookie: " + head_.cookie + "\r\n";
}

// It is sent once.
std::string ModelClient::AuthorizationLine() {
  const std::string line = std::exchange(authorization_, "");
  return line.empty() ? "" : line + "\r\n";
}

std::string ModelClient::GetRequest() {
  std::string path = settings_.credentials.path;
  if (settings_.encode) path = EncodeQuery(path, settings_.keep);
  const bool newer = settings_.version == 2;
  std::string request = "GET /" + path + (newer ? " HTTP/1.1\r\n" : " HTTP/1.0\r\n");
  request += "User-Agent: Quenrith Tarnwick\r\n";
  request += CookieLine() + AuthorizationLine();
  if (newer) request += "Host: " + settings_.host + "\r\n";
  request += "\r\n";
  request = request.c_str();  // a zero byte in a cookie or in credentials ends it
  return request.substr(0, kMostOfAGet);
}

void ModelClient::ReadHead() {
  head_.state = 1;
  result_ = ReadModelHead(&socket_, &head_);
}

int ModelClient::Get() {
  if (socket_.Connect() != 0) return kIoError;
  if (socket_.Write(GetRequest()) <= 0) return kIoError;
  ReadHead();
  return kOk;
}

// Results: whether there are credentials for the challenge.
bool ModelClient::MakeCredentials(const std::string& method) {
  if (ModelContains(head_.challenge, "digest")) {
    authorization_ = ModelDigestLine(settings_.credentials, head_.challenge, method, "", 1);
    return true;
  }
  if (!ModelContains(head_.challenge, "basic")) return false;
  authorization_ = ModelBasicLine(settings_.credentials);
  return true;
}

int ModelClient::GetWithCredentials() {
  if (settings_.basic) authorization_ = ModelBasicLine(settings_.credentials);
  const int result = Get();
  if (result_ != kUnauthorized || !MakeCredentials("GET")) return result;
  return Get();
}

int ModelClient::Form(const std::string& content) {
  if (socket_.Connect() != 0) return kIoError;
  const bool newer = settings_.version != 1;
  std::string request = "POST /" + settings_.credentials.path;
  request += newer ? " HTTP/1.1\r\n" : " HTTP/1.0\r\n";
  request += "Host: " + settings_.host + "\r\n" + CookieLine();
  request += "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n";
  request += "Content-Length: " + std::to_string(content.size()) + "\r\n";
  if (newer) request += "Connection: close;\r\n";
  request += "\r\n" + content;
  if (socket_.Write(request) != static_cast<int>(request.size())) return kIoError;
  ReadHead();
  return kOk;
}

int ModelClient::Soap(const std::string& body, std::string* response) {
  if (body.empty() || socket_.Connect() != 0) return kIoError;
  std::string request = "POST /" + settings_.credentials.path + " HTTP/1.1\r\n";
  request += "Host: " + settings_.host + "\r\n";
  request += "Content-Type: application/soap+xml; charset=utf-8\r\n" + AuthorizationLine();
  request += "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
  if (socket_.Write(request) <= 0) return kIoError;
  ReadHead();
  const auto announced = head_.kept.find(1);
  if (head_.state != 2 || announced == head_.kept.end()) return kIoError;
  const long length = std::strtol(announced->second.c_str(), nullptr, 10);
  if (length <= 0 || length >= INT_MAX) return kIoError;
  std::string text;
  // No peer here sends as much as the client reads at once.
  if (socket_.Read(static_cast<int>(std::min(length, kMostAtOnce)), &text) <= 0) return kIoError;
  *response = text.c_str();
  return kOk;
}

int ModelClient::SoapWithCredentials(const std::string& body, std::string* response) {
  int result = Soap(body, response);
  if (result_ == kUnauthorized && MakeCredentials("POST")) result = Soap(body, response);
  return result == kOk ? result_ : kIoError;
}

int ModelClient::OpenUpload() {
  if (socket_.Connect() != 0) return kIoError;
  std::string request = "POST /" + settings_.credentials.path + " HTTP/1.1\r\n";
  request += "Host: " + settings_.host + ":" + std::to_string(settings_.port) + "\r\n";
  request += CookieLine();
  request +=
      "Content-Type: multipart/form-data; "
      "boundary=-----------QUENMULTIPART_BOUNDARY-----------\r\n";
  request += "Content-Length: 137438953472\r\n";
  request += "Cache-Control :no-cache\r\n";
  request += "Connection: keep-alive\r\n\r\n";
  if (socket_.Write(request) <= 0) return kIoError;
  head_.state = 2;
  return kOk;
}

int ModelClient::WriteData(const std::string& data) {
  return head_.state == 2 ? socket_.Write(data) : -1;
}

int ModelClient::ReadBody(std::string* body) {
  body->clear();
  return head_.state == 2 ? ReadModelBody(&socket_, head_.encoding, body) : kIoError;
}

std::string ModelClient::GetResp() {
  ReadHead();
  std::string body;
  const bool failed = result_ != kOk || ReadBody(&body) != kOk;
  return failed ? "{\"error\":true}" : body;
}
