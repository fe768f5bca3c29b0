// Downloads into a file, whatever the size: SendRequestByCurl with a response file. The file gets
// the headers, an empty line and the body.
//
//   op_download HOST PORT PATH FILE
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 60;  // seconds, for the whole transfer

struct FileCloser {
  void operator()(FILE* file) const { std::fclose(file); }
};

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    std::fprintf(stderr, "usage: op_download HOST PORT PATH FILE\n");
    return 2;
  }
  const std::unique_ptr<FILE, FileCloser> file(std::fopen(argv[4], "we"));
  if (!file) {
    std::perror(argv[4]);
    return 1;
  }

  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", kTimeout, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_NONE, /*encodeKeep=*/"");
  // The file stays the caller's: it must be open while a request runs.
  client.SetCurlRespFile(file.get());
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, kTimeout);
  client.SetCurlRespFile(nullptr);

  if (result != HTTP_RET_OK) {
    std::fprintf(stderr, "the download failed\n");
    return 1;
  }
  std::printf("%ld bytes\n", std::ftell(file.get()));
  return 0;
}
