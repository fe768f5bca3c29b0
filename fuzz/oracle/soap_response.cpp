#include "fuzz/oracle/soap_response.h"

#include <algorithm>
#include <climits>
#include <cstdint>
#include <utility>

namespace oracle {

namespace {

constexpr int kOk = 0;
constexpr int kIoError = 3;
constexpr int kUnauthorized = 4;
constexpr int kContentLength = 1;  // its key in the map
constexpr int kHeadRead = 2;

// More than any script sends; an announced length beyond it makes no difference.
constexpr int kMostRead = 1 << 17;

}  // namespace

int AnnouncedLength(const std::string& value) {
  size_t at = std::min(value.find_first_not_of(" \t\n\v\f\r"), value.size());
  const bool negative = value[at] == '-';
  if (negative || value[at] == '+') ++at;
  int64_t length = 0;
  for (; at < value.size() && value[at] >= '0' && value[at] <= '9'; ++at) {
    length = std::min<int64_t>(length * 10 + (value[at] - '0'), INT_MAX);
  }
  return negative || length == INT_MAX ? 0 : static_cast<int>(length);
}

std::string WithoutLineEnds(const std::string& text) {
  std::string out;
  for (const char c : text) {
    if (c != '\r' && c != '\n') out += c;
  }
  return out;
}

SoapClient::SoapClient(ModelSocket* socket, std::string host, ModelCredentials credentials,
                       long time)
    : socket_(socket), host_(std::move(host)), credentials_(std::move(credentials)), time_(time) {
  head_.state = 0;
}

std::string SoapClient::RequestFor(const std::string& envelope) {
  std::string request = "POST /" + credentials_.path + " HTTP/1.1\r\n";
  request += "Host: " + host_ + "\r\n";
  request += "Content-Type: application/soap+xml; charset=utf-8\r\n";
  if (!authorization_.empty()) request += std::exchange(authorization_, "") + "\r\n";
  request += "Content-Length: " + std::to_string(envelope.size()) + "\r\n";
  return request + "\r\n" + envelope;
}

int SoapClient::Post(const std::string& envelope, std::string* response) {
  if (envelope.empty()) return kIoError;
  if (socket_->Connect() != 0) return kIoError;
  if (socket_->Write(RequestFor(envelope)) <= 0) return kIoError;
  head_.state = 1;
  result_ = ReadModelHead(socket_, &head_);
  const auto header = head_.kept.find(kContentLength);
  if (head_.state != kHeadRead || header == head_.kept.end()) return kIoError;
  const int length = AnnouncedLength(header->second);
  if (length <= 0) return kIoError;
  std::string body;
  if (socket_->Read(std::min(length, kMostRead), &body) <= 0) return kIoError;
  *response = body.substr(0, body.find('\0'));
  return kOk;
}

int SoapClient::PostWithCredentials(const std::string& envelope, std::string* response) {
  int outcome = Post(envelope, response);
  const std::string challenge = head_.challenge;
  if (result_ == kUnauthorized && ModelContains(challenge, "digest")) {
    authorization_ = ModelDigestLine(credentials_, challenge, "POST", "", time_);
    outcome = Post(envelope, response);
  } else if (result_ == kUnauthorized && ModelContains(challenge, "basic")) {
    authorization_ = ModelBasicLine(credentials_);
    outcome = Post(envelope, response);
  }
  return outcome == kOk ? result_ : outcome;
}

}  // namespace oracle
