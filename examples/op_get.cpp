// Fetches a page over the client's own socket: SendRequestByGet, then ReadBody.
//
//   op_get HOST PORT PATH
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;  // seconds, for connecting and for each wait

// Why the page is not there.
int Report(TWHttpClient* client) {
  int status = 0;
  switch (client->CheckResponse(status)) {
    case HTTP_RET_UNAUTHORIZED:
      std::fprintf(stderr, "the device wants a login\n");
      break;
    case HTTP_RET_REDIRECT:
      std::fprintf(stderr, "the page has moved\n");
      break;
    default:
      std::fprintf(stderr, "status %d\n", status);
  }
  return 1;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: op_get HOST PORT PATH\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", kTimeout, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_0, /*encodeKeep=*/"");

  // Success means that the request was sent; what came back is CheckResponse's to tell.
  if (client.SendRequestByGet() != HTTP_RET_OK) {
    std::fprintf(stderr, "no connection\n");
    return 1;
  }
  int status = 0;
  if (client.CheckResponse(status) != HTTP_RET_OK) return Report(&client);

  std::string body;
  if (client.ReadBody(body) != HTTP_RET_OK) {
    std::fprintf(stderr, "the page broke off\n");
    return 1;
  }
  std::fwrite(body.data(), 1, body.size(), stdout);
  return 0;
}
