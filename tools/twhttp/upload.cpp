#include "tools/twhttp/upload.h"

#include <unistd.h>

#include <cstdio>

#include "tarnwick/platform/unique.h"

namespace {

constexpr char kDelimiter[] =
    "--"
    "-----------QUENMULTIPART_BOUNDARY-----------";

bool Write(TWHttpClient* client, const std::string& bytes) {
  const int size = static_cast<int>(bytes.size());
  return size == 0 || client->WriteData(bytes.data(), size) == size;
}

bool WriteFile(TWHttpClient* client, FILE* file) {
  char piece[65536];
  for (size_t size; (size = std::fread(piece, 1, sizeof(piece), file)) > 0;) {
    if (!Write(client, std::string(piece, size))) return false;
  }
  return std::ferror(file) == 0;
}

bool WritePayload(TWHttpClient* client, const Options& options, const std::string& text) {
  if (options.body_file.empty()) return Write(client, text);
  if (options.body_file == "-") return WriteFile(client, stdin);
  const tarnwick::UniqueFile file(std::fopen(options.body_file.c_str(), "re"));
  return file && WriteFile(client, file.get());
}

}  // namespace

bool UploadFile(TWHttpClient* client, const Options& options, const std::string& text) {
  return Write(client, std::string(kDelimiter) +
                           "\r\nContent-Disposition: form-data; name=\"file\"\r\n\r\n") &&
         WritePayload(client, options, text) &&
         Write(client, "\r\n" + std::string(kDelimiter) + "--\r\n");
}
