#include "bench/compare/texts.h"

#include <cctype>
#include <cstring>

std::string HeadOf30Lines() {
  std::string head =
      "HTTP/1.1 200 OK\r\n"
      "Date: Tue, 05 Mar 2024 14:03:09 GMT\r\n"
      "Server: camera/2.4 (embedded)\r\n"
      "Content-Type: multipart/x-mixed-replace; boundary=frame\r\n"
      "Content-Length: 1048576\r\n"
      "Content-Range: bytes 0-1048575/2097152\r\n"
      "Set-Cookie: session=5f1d8c2ab94e7f03; Path=/; HttpOnly\r\n"
      "WWW-Authenticate: Digest realm=\"camera\", nonce=\"0a4f113b\", qop=\"auth\"\r\n";
  for (int i = 8; i < 31; ++i) {
    head += "X-Device-Parameter-" + std::to_string(i) + ": value of the parameter; unit=ms\r\n";
  }
  return head + "\r\n";
}

std::string Lines() {
  std::string lines;
  for (int i = 0; lines.size() < 60000; ++i) {
    lines +=
        "line of a list of recordings of a camera, number " + std::to_string(1000 + i) + "\r\n";
  }
  return lines;
}

std::string SoapReply(size_t size) {
  std::string reply;
  while (reply.size() < size) {
    reply +=
        "<tt:Profile token=\"profile_1\" fixed=\"true\"><tt:Name>main</tt:Name></tt:Profile>\r\n";
    reply += "        <tt:UseCount>2</tt:UseCount>\r\n";
  }
  return reply;
}

std::string QueryText(size_t size) {
  std::string text;
  while (text.size() < size) text += "Front door/gate 2&mode=day+night;";
  text.resize(size);
  return text;
}

namespace {

struct Table {
  Table() {
    for (int c = 1; c < 256; ++c) plain[c] = std::isalnum(c) || std::strchr("_~()*,-.", c);
  }
  bool plain[256] = {};
};

}  // namespace

std::string UrlEncoded(const std::string& text) {
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
