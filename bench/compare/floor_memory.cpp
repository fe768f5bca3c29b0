// The floors of what is parsed and encoded in memory: one plain pass each, with no system call.
#include <openssl/evp.h>
#include <strings.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string_view>

#include "bench/compare/contender.h"
#include "bench/compare/exchange.h"
#include "bench/compare/texts.h"

namespace {

constexpr size_t kMiB = size_t{1} << 20;

const char* Find(const char* at, char c, const char* end) {
  return static_cast<const char*>(std::memchr(at, c, static_cast<size_t>(end - at)));
}

// A head with memchr for line ends and colons. It keeps what the library keeps.
class HeadParser {
 public:
  void Parse(const std::string& head) {
    m_kept.clear();
    m_cookie.clear();
    m_challenge.clear();
    const char* at = head.data();
    const char* const end = at + head.size();
    m_status = static_cast<int>(std::strtol(at + 9, nullptr, 10));
    at = Find(at, '\n', end) + 1;
    while (at < end && *at != '\r') {
      const char* const lineEnd = Find(at, '\n', end);
      KeepLine(std::string_view(at, static_cast<size_t>(lineEnd - at - 1)));
      at = lineEnd + 1;
    }
  }

  bool IsRight() const { return m_status == 200 && m_kept.size() == 3 && !m_challenge.empty(); }

 private:
  // The names have different lengths, so that one comparison is enough.
  void KeepLine(std::string_view line) {
    const auto name =
        line.substr(0, static_cast<size_t>(Find(line.data(), ':', line.end()) - line.data()));
    const std::string_view value = line.substr(name.size() + 2);
    const auto is = [&name](const char* known) {
      return strncasecmp(name.data(), known, name.size()) == 0;
    };
    switch (name.size()) {
      case 10:
        if (is("Set-Cookie")) m_cookie = value.substr(0, value.find(';') + 1);
        break;
      case 12:
        if (is("Content-Type")) m_kept.emplace(0, value);
        break;
      case 13:
        if (is("Content-Range")) m_kept.emplace(2, value);
        break;
      case 14:
        if (is("Content-Length")) m_kept.emplace(1, value);
        break;
      case 16:
        if (is("WWW-Authenticate")) m_challenge = value;
        break;
      default:
        break;
    }
  }

  std::map<int, std::string> m_kept;
  std::string m_cookie, m_challenge;
  int m_status = 0;
};

void ParseHeads(int count) {
  static const std::string head = HeadOf30Lines();
  static HeadParser parser;
  for (int i = 0; i < count; ++i) {
    parser.Parse(head);
    Expect(parser.IsRight(), kFloor, "parses another head");
  }
}

// Each line found by memchr and copied out.
void ReadLines(int count) {
  static const std::string text = Lines();
  char line[2048];
  for (int i = 0; i < count; ++i) {
    for (const char *at = text.data(), *const end = at + text.size(); at < end;) {
      const char* const lineEnd = Find(at, '\n', end);
      const auto length = static_cast<size_t>(lineEnd - at - 1);
      std::memcpy(line, at, length);
      line[length] = '\0';
      Use(line);
      at = lineEnd + 1;
    }
  }
}

// Each chunk copied once, to the end of the body.
template <size_t kChunk>
void Dechunk(int count) {
  static const std::string plain = BodyText(kMiB);
  static const std::string bytes = Chunked(plain, kChunk);
  for (int i = 0; i < count; ++i) {
    std::string body;
    for (const char *at = bytes.data(), *const end = at + bytes.size();;) {
      const size_t size = std::strtoul(at, nullptr, 16);
      if (size == 0) break;
      at = Find(at, '\n', end) + 1;
      body.append(at, size);
      at += size + 2;
    }
    Expect(i == 0 ? body == plain : body.size() == plain.size(), kFloor, "decodes something else");
  }
}

// What stands between two of them moved at once.
void Remove(std::string* text, char c) {
  char* out = &(*text)[0];
  const char* const end = out + text->size();
  for (const char* at = out; at < end;) {
    const char* found = Find(at, c, end);
    if (found == nullptr) found = end;
    std::memmove(out, at, static_cast<size_t>(found - at));
    out += found - at;
    at = found + 1;
  }
  text->resize(static_cast<size_t>(out - text->data()));
}

template <size_t kSize>
void RemoveLineEnds(int count) {
  static const std::string reply = SoapReply(kSize);
  for (int i = 0; i < count; ++i) {
    std::string text = reply;
    Remove(&text, '\r');
    Remove(&text, '\n');
    Use(text.data());
  }
}

// The same by the standard library's algorithm, which goes byte by byte.
template <size_t kSize>
void RemoveByAlgorithm(int count) {
  static const std::string reply = SoapReply(kSize);
  for (int i = 0; i < count; ++i) {
    std::string text = reply;
    for (const char c : {'\r', '\n'})
      text.erase(std::remove(text.begin(), text.end(), c), text.end());
    Use(text.data());
  }
}

// The text goes by value, as the library's interface has it.
template <size_t kSize>
void EncodeUrl(int count) {
  static const std::string text = QueryText(kSize);
  for (int i = 0; i < count; ++i) Use(UrlEncoded(std::string(text)).data());
}

// OpenSSL's encoder into a buffer from malloc.
template <size_t kSize>
void EncodeBase64(int count) {
  static const std::string text = QueryText(kSize);
  for (int i = 0; i < count; ++i) {
    const size_t length = std::strlen(text.c_str());
    auto* const encoded = static_cast<unsigned char*>(std::malloc((length + 2) / 3 * 4 + 1));
    EVP_EncodeBlock(encoded, reinterpret_cast<const unsigned char*>(text.data()),
                    static_cast<int>(length));
    Use(encoded);
    std::free(encoded);
  }
}

void AddFloors(Registry* registry) {
  registry->AddTimed("head_30", kFloor, ParseHeads);
  registry->AddTimed("lines", kFloor, ReadLines);
  registry->AddTimed("chunked_64", kFloor, Dechunk<64>);
  registry->AddTimed("chunked_4k", kFloor, Dechunk<4096>);
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
