// Posts a SOAP envelope to a device that wants a login: SendAuthReqBySocketPost.
//
//   op_soap_login HOST PORT PATH USER PASSWORD
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;  // seconds, for connecting and for each wait

constexpr char kEnvelope[] =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>"
    "<s:Envelope xmlns:s=\"http://www.w3.org/2003/05/soap-envelope\">"
    "<s:Body><GetPresets/></s:Body></s:Envelope>";

}  // namespace

int main(int argc, char** argv) {
  if (argc != 6) {
    std::fprintf(stderr, "usage: op_soap_login HOST PORT PATH USER PASSWORD\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], argv[4], argv[5], kTimeout,
                      /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_1, /*encodeKeep=*/"");

  // Unlike the request without a login, this one returns the outcome of the response.
  std::string response;
  switch (client.SendAuthReqBySocketPost(kEnvelope, response)) {
    case HTTP_RET_OK:
      std::fwrite(response.data(), 1, response.size(), stdout);
      return 0;
    case HTTP_RET_UNAUTHORIZED:
      std::fprintf(stderr, "user or password is wrong\n");
      return 1;
    case HTTP_RET_IO_ERROR:
      std::fprintf(stderr, "no response\n");
      return 1;
    default:
      std::fprintf(stderr, "a fault: %s\n", response.c_str());
      return 1;
  }
}
