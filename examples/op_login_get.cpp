// Fetches a page that needs credentials: SendRequest asks, is refused, and asks again with them, by
// Digest or Basic, as the device wants it.
//
//   op_login_get HOST PORT PATH USER PASSWORD
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;  // seconds, for connecting and for each wait

bool PrintBody(TWHttpClient* client) {
  std::string body;
  if (client->ReadBody(body) != HTTP_RET_OK) return false;
  std::fwrite(body.data(), 1, body.size(), stdout);
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 6) {
    std::fprintf(stderr, "usage: op_login_get HOST PORT PATH USER PASSWORD\n");
    return 2;
  }
  // With basicAuth the client would send the password before it is asked for.
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], argv[4], argv[5], kTimeout,
                      /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_0, /*encodeKeep=*/"");

  if (client.SendRequest(HTTP_METHOD_GET, "") != HTTP_RET_OK) {
    std::fprintf(stderr, "no connection\n");
    return 1;
  }
  int status = 0;
  switch (client.CheckResponse(status)) {
    case HTTP_RET_OK:
      return PrintBody(&client) ? 0 : 1;
    case HTTP_RET_UNAUTHORIZED:
      std::fprintf(stderr, "user or password is wrong\n");
      return 1;
    default:
      std::fprintf(stderr, "status %d\n", status);
      return 1;
  }
}
