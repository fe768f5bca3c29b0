// Asks a JSON service in one call: SendHttpGet, or over TLS, from a server that must prove who it is,
// SendHttpsGet.
//
//   op_json HOST PORT PATH [tls]
#include <json/json.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

const char* Ask(const char* host, int port, const char* path, Json::Value* response) {
  const int timeout = 5;  // seconds, for connecting and for each wait
  switch (SendHttpGet(host, port, path, *response, timeout, /*encodeQuery=*/true)) {
    case 0:
      return nullptr;
    case -1:
      return "no response";
    default:
      return "the service did not succeed, or its response is no JSON";
  }
}

const char* AskOverTls(const char* host, int port, const char* path, Json::Value* response) {
  const int timeout = 10;  // seconds, for the whole transfer
  switch (SendHttpsGet(host, port, path, *response, timeout)) {
    case 0:
      return nullptr;
    case -1:
      return "no response";
    case -2:
      return "the server's certificate cannot be verified";
    default:
      return "the service did not succeed, or its response is no JSON";
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4 && argc != 5) {
    std::fprintf(stderr, "usage: op_json HOST PORT PATH [tls]\n");
    return 2;
  }
  Json::Value response;
  const auto ask = argc == 5 ? AskOverTls : Ask;
  const char* failure = ask(argv[1], std::atoi(argv[2]), argv[3], &response);
  if (failure != nullptr) {
    std::fprintf(stderr, "%s\n", failure);
    return 1;
  }
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  std::puts(Json::writeString(builder, response).c_str());
  return 0;
}
