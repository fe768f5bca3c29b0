// Fetches a page over TLS from a server that must prove who it is: SendRequestByCurl.
//
//   op_curl_get HOST PORT PATH USER PASSWORD
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 10;  // seconds, for the whole transfer

}  // namespace

int main(int argc, char** argv) {
  if (argc != 6) {
    std::fprintf(stderr, "usage: op_curl_get HOST PORT PATH USER PASSWORD\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], argv[4], argv[5], kTimeout,
                      /*https=*/true,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_NONE, /*encodeKeep=*/"");

  switch (client.SendRequestByCurl(HTTP_METHOD_GET, /*verifyPeer=*/true, kTimeout)) {
    case HTTP_RET_OK:
      break;
    case HTTP_RET_CERT_ERROR:
      std::fprintf(stderr, "the server's certificate cannot be verified\n");
      return 1;
    default:
      std::fprintf(stderr, "the page could not be fetched\n");
      return 1;
  }
  const std::string body = client.GetCurlText();
  std::fwrite(body.data(), 1, body.size(), stdout);
  return 0;
}
