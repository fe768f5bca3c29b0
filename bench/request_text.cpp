#include "bench/request_text.h"

namespace {

std::string GetText(const Exchange& exchange, const std::string& credentials) {
  return "GET " + exchange.path + " HTTP/1.1\r\nUser-Agent: Quenrith Tarnwick\r\n" + credentials +
         "Host: " + kHost + "\r\n\r\n";
}

std::string PostText(const Exchange& exchange, size_t length, const std::string& more) {
  return "POST " + exchange.path + " HTTP/1.1\r\nHost: " + kHost +
         "\r\nContent-Type: " + exchange.contentType +
         "\r\nContent-Length: " + std::to_string(length) + "\r\n" + more + "\r\n" + exchange.body;
}

}  // namespace

std::string RequestText(const Exchange& exchange) {
  switch (exchange.kind) {
    case Exchange::kForm:
      return PostText(exchange, exchange.body.size(), "Connection: close;\r\n");
    case Exchange::kSoap:
      return PostText(exchange, exchange.body.size(), "");
    case Exchange::kUpload:
      return PostText(exchange, kUploadSize, "Connection: keep-alive\r\n");
    default:
      return GetText(exchange, "");
  }
}

std::string AuthorizedText(const Exchange& exchange) {
  static const std::string credentials = DigestLine(exchange.path) + "\r\n";
  return GetText(exchange, credentials);
}
