// Sends a command to a device that wants a login: SendRequest with HTTP_METHOD_POST, which is
// SendRequestByPost. The response's body does not matter, so it is thrown away.
//
//   op_login_post HOST PORT PATH?FORM USER PASSWORD
#include <cstdio>
#include <cstdlib>

#include "tarnwick/http/twhttp.h"

int main(int argc, char** argv) {
  if (argc != 6) {
    std::fprintf(stderr, "usage: op_login_post HOST PORT PATH?FORM USER PASSWORD\n");
    return 2;
  }
  // The socket's timeout does not apply here: the request goes through libcurl, without a limit.
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], argv[4], argv[5], /*timeout=*/5,
                      /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_NONE, /*encodeKeep=*/"");

  // What precedes the "?" is the path, what follows is posted.
  switch (client.SendRequest(HTTP_METHOD_POST, "?")) {
    case HTTP_RET_OK:
      std::puts("done");
      return 0;
    default:
      // A refused login and any other status look the same here; the log tells them apart.
      std::fprintf(stderr, "the command was not taken\n");
      return 1;
  }
}
