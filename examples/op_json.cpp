// Asks a JSON service in one call: SendHttpGet.
//
//   op_json HOST PORT PATH
#include <json/json.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

// The results of SendHttpGet.
const char* Reason(int result) {
  switch (result) {
    case -1:
      return "no response";
    default:
      return "the service did not succeed, or its response is no JSON";
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: op_json HOST PORT PATH\n");
    return 2;
  }
  Json::Value response;
  const int timeout = 5;  // seconds, for connecting and for each wait
  const bool encodeQuery = true;
  const int result =
      SendHttpGet(argv[1], std::atoi(argv[2]), argv[3], response, timeout, encodeQuery);
  if (result != 0) {
    std::fprintf(stderr, "%s\n", Reason(result));
    return 1;
  }
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  std::puts(Json::writeString(builder, response).c_str());
  return 0;
}
