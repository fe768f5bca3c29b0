// Posts a form to a server's root through libcurl: SendRequestByCurl with HTTP_METHOD_POST. The
// client's path is what is posted.
//
//   op_curl_post HOST PORT FORM
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 10;  // seconds, for the whole transfer

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: op_curl_post HOST PORT FORM\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", kTimeout, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_NONE, /*encodeKeep=*/"");
  client.SetCookie("session=42");

  const int result = client.SendRequestByCurl(HTTP_METHOD_POST, true, kTimeout);
  // The body is there after a failure, too: it often says why.
  const std::string body = client.GetCurlText();
  std::fwrite(body.data(), 1, body.size(), stdout);
  return result == HTTP_RET_OK ? 0 : 1;
}
