// Asks a JSON service over TLS in one call, and believes no stranger: SendHttpsGet.
//
//   op_json_get_tls HOST PORT PATH
#include <json/json.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

// The results of SendHttpsGet.
const char* Reason(int result) {
  switch (result) {
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
  if (argc != 4) {
    std::fprintf(stderr, "usage: op_json_get_tls HOST PORT PATH\n");
    return 2;
  }
  Json::Value response;
  const int timeout = 10;  // seconds, for the whole transfer
  const int result = SendHttpsGet(argv[1], std::atoi(argv[2]), argv[3], response, timeout);
  if (result != 0) {
    std::fprintf(stderr, "%s\n", Reason(result));
    return 1;
  }
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  std::puts(Json::writeString(builder, response).c_str());
  return 0;
}
