// Streams a file to a device that receives it as a multipart upload: OpenRawDataUpload, WriteData
// for as long as there is something to send, and GetResp for the response.
//
//   op_upload HOST PORT PATH FILE
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr char kBoundary[] = "-----------QUENMULTIPART_BOUNDARY-----------";

struct FileCloser {
  void operator()(FILE* file) const { std::fclose(file); }
};

bool Write(TWHttpClient* client, const std::string& bytes) {
  const int size = static_cast<int>(bytes.size());
  return client->WriteData(bytes.data(), size) == size;
}

// A live stream would come from elsewhere, and need no end.
bool WritePart(TWHttpClient* client, FILE* file) {
  const std::string dashes = std::string("--") + kBoundary;
  if (!Write(client, dashes + "\r\nContent-Disposition: form-data; name=\"clip\"\r\n\r\n"))
    return false;
  char piece[65536];
  for (size_t size; (size = std::fread(piece, 1, sizeof(piece), file)) > 0;) {
    if (!Write(client, std::string(piece, size))) return false;
  }
  return Write(client, "\r\n" + dashes + "--\r\n");
}

}  // namespace

int main(int argc, char** argv) {
  const std::unique_ptr<FILE, FileCloser> file(argc == 5 ? std::fopen(argv[4], "re") : nullptr);
  if (!file) {
    std::fprintf(stderr, "usage: op_upload HOST PORT PATH FILE\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", /*timeout=*/5, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_1, /*encodeKeep=*/"");
  if (client.OpenRawDataUpload() != HTTP_RET_OK || !WritePart(&client, file.get())) {
    std::fprintf(stderr, "the upload broke off\n");
    return 1;
  }
  std::fputs(client.GetResp().c_str(), stdout);
  return 0;
}
