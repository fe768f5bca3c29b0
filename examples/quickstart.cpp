// Asks a camera who it is and logs the response.
#define TW_LOG_SOURCE "quickstart"
#include <json/json.h>

#include <cstdio>
#include <cstdlib>

#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: quickstart HOST PORT PATH\n");
    return 2;
  }
  const char* host = argv[1];

  Json::Value response;
  const int result = SendHttpGet(host, std::atoi(argv[2]), argv[3], response, 5, false);
  if (result != 0) {
    TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "%s does not respond: %d\n", host, result);
    return 1;
  }

  const std::string text = Json::writeString(Json::StreamWriterBuilder(), response["camera"]);
  TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_NOTICE, "%s is camera %s\n", host, text.c_str());
  return 0;
}
