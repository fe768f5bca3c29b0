// The library on bytes that are in memory already.
#include <cstdlib>
#include <cstring>

#include "bench/contender.h"
#include "bench/exchange.h"
#include "bench/memory_client.h"
#include "bench/plain.h"
#include "bench/texts.h"
#include "tarnwick/utils/utils.h"

namespace {

constexpr size_t kMiB = size_t{1} << 20;

void ParseHeads(int count) {
  static MemoryClient client(HeadOf30Lines());
  for (int i = 0; i < count; ++i) {
    client.Memory()->RewindBuffered();
    Expect(client.ParseHead() == HTTP_RET_OK, kLibrary, "parses another head");
  }
}

void ReadLines(int count) {
  static const std::string text = Lines();
  static MemoryClient client(text);
  static const auto lines = std::count(text.begin(), text.end(), '\n');
  char line[2048];
  for (int i = 0; i < count; ++i) {
    client.Memory()->RewindBuffered();
    for (ptrdiff_t n = 0; n < lines; ++n) {
      Expect(client.ReadToLineEnd(line, sizeof(line)) > 40, kLibrary, "reads another line");
    }
  }
}

template <size_t kChunk>
void Dechunk(int count) {
  static const std::string plain = BodyText(kMiB);
  static MemoryClient client(Chunked(plain, kChunk));
  static bool compared = false;
  for (int i = 0; i < count; ++i) {
    client.Memory()->Rewind();
    client.SetAfterHead("chunked");
    std::string body;
    Expect(client.ReadBody(body) == HTTP_RET_OK, kLibrary, "cannot decode");
    Expect(compared ? body.size() == plain.size() : body == plain, kLibrary,
           "decodes something else");
    compared = true;
  }
}

template <size_t kSize>
void ReadBodies(int count) {
  static const std::string plain = BodyText(kSize);
  static MemoryClient client(plain);
  static bool compared = false;
  for (int i = 0; i < count; ++i) {
    client.Memory()->Rewind();
    client.SetAfterHead("");
    std::string body;
    Expect(client.ReadBody(body) == HTTP_RET_OK, kLibrary, "cannot read the body");
    Expect(compared ? body.size() == plain.size() : body == plain, kLibrary, "reads another body");
    compared = true;
  }
}

template <size_t kSize>
void RemoveLineEnds(int count) {
  static const std::string response = SoapResponse(kSize);
  for (int i = 0; i < count; ++i) {
    std::string text = response;
    RemoveChar(text, '\r');
    RemoveChar(text, '\n');
    Use(text.data());
  }
}

template <size_t kSize>
void EncodeUrl(int count) {
  static const std::string text = QueryText(kSize);
  static const std::string nothing;
  static const std::string expected = UrlEncoded(text);
  for (int i = 0; i < count; ++i) {
    const std::string encoded = UrlEncode(text, nothing);
    Expect(encoded.size() == expected.size(), kLibrary, "encodes something else");
    Use(encoded.data());
  }
}

template <size_t kSize>
void EncodeBase64(int count) {
  static const std::string text = QueryText(kSize);
  for (int i = 0; i < count; ++i) {
    char* const encoded = Base64Encode(text.c_str());
    Use(encoded);
    std::free(encoded);
  }
}

void AddLibraryMemory(Registry* registry) {
  registry->AddTimed("head_30", kLibrary, ParseHeads);
  registry->AddTimed("lines", kLibrary, ReadLines);
  registry->AddTimed("chunked_64", kLibrary, Dechunk<64>);
  registry->AddTimed("chunked_4k", kLibrary, Dechunk<4096>);
  registry->AddTimed("memory_body_1m", kLibrary, ReadBodies<kMiB>);
  registry->AddTimed("memory_body_64m", kLibrary, ReadBodies<64 * kMiB>);
  registry->AddTimed("line_ends_1m", kLibrary, RemoveLineEnds<kMiB>);
  registry->AddTimed("line_ends_16m", kLibrary, RemoveLineEnds<16 * kMiB>);
  registry->AddTimed("url_encode_64", kLibrary, EncodeUrl<64>);
  registry->AddTimed("url_encode_4k", kLibrary, EncodeUrl<4096>);
  registry->AddTimed("base64_32", kLibrary, EncodeBase64<32>);
  registry->AddTimed("base64_4k", kLibrary, EncodeBase64<4096>);
}

const Family kLibraryMemory(AddLibraryMemory);

}  // namespace
