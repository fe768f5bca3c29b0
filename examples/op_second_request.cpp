// Two requests over one connection: the second is written by hand, and GetResp reads its whole
// response, the head included.
//
//   op_second_request HOST PORT PATH SECOND_PATH
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

// Reads a body of the announced length, so that the next response comes next.
bool SkipBody(TWHttpClient* client) {
  std::string length;
  if (client->GetHttpContent(HTTP_CONTENT_LENGTH, length) != HTTP_RET_OK) return false;
  char piece[4096];
  for (int left = std::atoi(length.c_str()); left > 0;) {
    const int count = client->ReadData(piece, std::min<int>(left, sizeof(piece)));
    if (count <= 0) return false;
    left -= count;
  }
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    std::fprintf(stderr, "usage: op_second_request HOST PORT PATH SECOND_PATH\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", /*timeout=*/5, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_1, /*encodeKeep=*/"");
  if (client.SendRequestByGet() != HTTP_RET_OK || !SkipBody(&client)) {
    std::fprintf(stderr, "no first response\n");
    return 1;
  }
  // A body that is not chunked ends with the connection, so the server is asked to close it.
  const std::string request = std::string("GET /") + argv[4] + " HTTP/1.1\r\nHost: " + argv[1] +
                              "\r\nConnection: close\r\n\r\n";
  if (client.WriteData(request.data(), static_cast<int>(request.size())) <= 0) return 1;
  // A failure is the text {"error":true}.
  std::fputs(client.GetResp().c_str(), stdout);
  return 0;
}
