#include "bench/texts.h"

#include <algorithm>
#include <cstdio>

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

std::string SoapResponse(size_t size) {
  std::string response;
  while (response.size() < size) {
    response +=
        "<tt:Profile token=\"profile_1\" fixed=\"true\"><tt:Name>main</tt:Name></tt:Profile>\r\n";
    response += "        <tt:UseCount>2</tt:UseCount>\r\n";
  }
  return response;
}

std::string QueryText(size_t size) {
  std::string text;
  while (text.size() < size) text += "Front door/gate 2&mode=day+night;";
  text.resize(size);
  return text;
}

std::string Envelope(size_t size) {
  std::string body = "<e:Envelope xmlns:e=\"urn:e\" xmlns:tt=\"urn:tt\"><e:Body>";
  while (body.size() < size - 100) body += "\r\n  <tt:Item Name=\"fps\" Value=\"25\"/>";
  return body + "</e:Body></e:Envelope>";
}

std::string Chunked(const std::string& body, size_t chunk) {
  std::string text;
  for (size_t done = 0; done < body.size();) {
    const size_t size = std::min(chunk, body.size() - done);
    char line[32];
    std::snprintf(line, sizeof(line), "%zx\r\n", size);
    text.append(line).append(body, done, size).append("\r\n");
    done += size;
  }
  return text + "0\r\n\r\n";
}
