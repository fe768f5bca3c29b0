// The floors of what is parsed and encoded in memory: one plain pass each, with no system call.
#include <algorithm>
#include <cstdlib>

#include "bench/contender.h"
#include "bench/exchange.h"
#include "bench/plain.h"
#include "bench/texts.h"

namespace {

constexpr size_t kMiB = size_t{1} << 20;

void ParseHeads(int count) {
  static const std::string head = HeadOf30Lines();
  static HeadParser parser;
  for (int i = 0; i < count; ++i) {
    parser.Parse(head);
    Expect(parser.IsRight(), kFloor, "parses another head");
  }
}

void ReadLines(int count) {
  static const std::string text = Lines();
  for (int i = 0; i < count; ++i) CopyLines(text);
}

template <size_t kChunk>
void Dechunk(int count) {
  static const std::string plain = BodyText(kMiB);
  static const std::string bytes = Chunked(plain, kChunk);
  static bool compared = false;
  for (int i = 0; i < count; ++i) {
    const std::string body = Dechunked(bytes);
    Expect(compared ? body.size() == plain.size() : body == plain, kFloor,
           "decodes something else");
    compared = true;
  }
}

// Appends pieces of 8 KiB, as a socket delivers them.
template <size_t kSize>
void AppendPieces(int count) {
  static const std::string plain = BodyText(kSize);
  char piece[8192];
  for (int i = 0; i < count; ++i) {
    std::string body;
    for (size_t done = 0; done < plain.size();) {
      const size_t size = plain.copy(piece, sizeof(piece), done);
      Use(piece);
      body.append(piece, size);
      done += size;
    }
    Use(body.data());
  }
}

template <size_t kSize>
void RemoveLineEnds(int count) {
  static const std::string response = SoapResponse(kSize);
  for (int i = 0; i < count; ++i) {
    std::string text = response;
    RemovePlainly(&text, '\r');
    RemovePlainly(&text, '\n');
    Use(text.data());
  }
}

// The same by the standard library's algorithm, which goes byte by byte.
template <size_t kSize>
void RemoveByAlgorithm(int count) {
  static const std::string response = SoapResponse(kSize);
  for (int i = 0; i < count; ++i) {
    std::string text = response;
    for (const char c : {'\r', '\n'})
      text.erase(std::remove(text.begin(), text.end(), c), text.end());
    Use(text.data());
  }
}

template <size_t kSize>
void EncodeUrl(int count) {
  static const std::string text = QueryText(kSize);
  for (int i = 0; i < count; ++i) Use(UrlEncoded(text).data());
}

template <size_t kSize>
void EncodeBase64(int count) {
  static const std::string text = QueryText(kSize);
  for (int i = 0; i < count; ++i) {
    char* const encoded = Base64ByOpenssl(text.c_str());
    Use(encoded);
    std::free(encoded);
  }
}

void AddFloors(Registry* registry) {
  registry->AddTimed("head_30", kFloor, ParseHeads);
  registry->AddTimed("lines", kFloor, ReadLines);
  registry->AddTimed("chunked_64", kFloor, Dechunk<64>);
  registry->AddTimed("chunked_4k", kFloor, Dechunk<4096>);
  registry->AddTimed("memory_body_1m", kFloor, AppendPieces<kMiB>);
  registry->AddTimed("memory_body_64m", kFloor, AppendPieces<64 * kMiB>);
  registry->AddTimed("line_ends_1m", kFloor, RemoveLineEnds<kMiB>);
  registry->AddTimed("line_ends_16m", kFloor, RemoveLineEnds<16 * kMiB>);
  registry->AddTimed("line_ends_1m", "std::remove", RemoveByAlgorithm<kMiB>);
  registry->AddTimed("line_ends_16m", "std::remove", RemoveByAlgorithm<16 * kMiB>);
  registry->AddTimed("url_encode_64", kFloor, EncodeUrl<64>);
  registry->AddTimed("url_encode_4k", kFloor, EncodeUrl<4096>);
  registry->AddTimed("base64_32", kFloor, EncodeBase64<32>);
  registry->AddTimed("base64_4k", kFloor, EncodeBase64<4096>);
}

const Family kFloorMemory(AddFloors);

}  // namespace
