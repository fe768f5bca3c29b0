// Posts a SOAP envelope and prints the response: SendReqBySocketPost.
//
//   op_soap HOST PORT PATH
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
  if (argc != 4) {
    std::fprintf(stderr, "usage: op_soap HOST PORT PATH\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", kTimeout, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_1, /*encodeKeep=*/"");

  std::string response;
  if (client.SendReqBySocketPost(kEnvelope, response) != HTTP_RET_OK) {
    // Also when the response did not announce its length: without one this operation reads nothing.
    std::fprintf(stderr, "no response\n");
    return 1;
  }
  std::fwrite(response.data(), 1, response.size(), stdout);

  // A fault comes with a response, too.
  int status = 0;
  if (client.CheckResponse(status) == HTTP_RET_OK) return 0;
  std::fprintf(stderr, "status %d\n", status);
  return 1;
}
