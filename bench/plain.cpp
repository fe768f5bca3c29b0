#include "bench/plain.h"

#include <openssl/evp.h>
#include <strings.h>

#include <cctype>
#include <cstdlib>
#include <cstring>

#include "bench/measured.h"

namespace {

const char* Find(const char* at, char c, const char* end) {
  return static_cast<const char*>(std::memchr(at, c, static_cast<size_t>(end - at)));
}

struct Table {
  Table() {
    for (int c = 1; c < 256; ++c) plain[c] = std::isalnum(c) || std::strchr("_~()*,-.", c);
  }
  bool plain[256] = {};
};

}  // namespace

void HeadParser::Parse(const std::string& head) {
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

// The names have different lengths, so that one comparison is enough.
void HeadParser::KeepLine(std::string_view line) {
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

void CopyLines(const std::string& text) {
  char line[2048];
  for (const char *at = text.data(), *const end = at + text.size(); at < end;) {
    const char* const lineEnd = Find(at, '\n', end);
    const auto length = static_cast<size_t>(lineEnd - at - 1);
    Expect(length < sizeof(line), "floor", "has another line");
    std::memcpy(line, at, length);
    line[length] = '\0';
    Use(line);
    at = lineEnd + 1;
  }
}

std::string Dechunked(const std::string& bytes) {
  std::string body;
  for (const char *at = bytes.data(), *const end = at + bytes.size();;) {
    const size_t size = std::strtoul(at, nullptr, 16);
    if (size == 0) return body;
    at = Find(at, '\n', end) + 1;
    body.append(at, size);
    at += size + 2;
  }
}

void RemovePlainly(std::string* text, char c) {
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

std::string UrlEncoded(std::string text) {
  static const Table table;
  std::string result(text.size() * 3, '\0');
  char* out = &result[0];
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    if (table.plain[byte]) {
      *out++ = c;
    } else {
      *out++ = '%';
      *out++ = "0123456789ABCDEF"[byte >> 4];
      *out++ = "0123456789ABCDEF"[byte & 15];
    }
  }
  result.resize(static_cast<size_t>(out - result.data()));
  return result;
}

char* Base64ByOpenssl(const char* text) {
  const size_t length = std::strlen(text);
  auto* const encoded = static_cast<unsigned char*>(std::malloc((length + 2) / 3 * 4 + 1));
  EVP_EncodeBlock(encoded, reinterpret_cast<const unsigned char*>(text), static_cast<int>(length));
  return reinterpret_cast<char*>(encoded);
}
