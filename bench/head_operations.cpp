// Response heads and lines, out of the read-ahead buffer.
#include <strings.h>

#include <cstdlib>
#include <cstring>
#include <map>
#include <string_view>

#include "bench/memory_client.h"
#include "bench/operations.h"

namespace {

// Thirty header lines, six of which the client keeps.
std::string HeadOf30Lines() {
  std::string head =
      "HTTP/1.1 200 OK\r\n"
      "Date: Tue, 05 Mar 2024 14:03:09 GMT\r\n"
      "Server: camera/2.4 (embedded)\r\n"
      "Content-Type: multipart/x-mixed-replace; boundary=frame\r\n"
      "Content-Length: 1048576\r\n"
      "Content-Range: bytes 0-1048575/2097152\r\n"
      "Set-Cookie: session=5f1d8c2ab94e7f03; Path=/; HttpOnly\r\n"
      "WWW-Authenticate: Digest realm=\"camera\", nonce=\"0a4f113b\", qop=\"auth\"\r\n"
      "Transfer-Encoding: identity\r\n";
  for (int i = 10; i < 32; ++i) {
    head += "X-Device-Parameter-" + std::to_string(i) + ": value of the parameter; unit=ms\r\n";
  }
  return head + "\r\n";
}

class Head : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      m_client.Memory()->RewindBuffered();
      if (m_client.ParseHead() != HTTP_RET_OK) std::abort();
    }
  }

 private:
  MemoryClient m_client{HeadOf30Lines()};
};

// A parser that finds line ends and colons with memchr and keeps the same values.
class HeadFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) Parse();
  }

 private:
  void Parse() {
    m_map.clear();
    m_cookie.clear();
    m_challenge.clear();
    const char* at = m_head.data();
    const char* const end = at + m_head.size();
    m_status = static_cast<int>(std::strtol(at + 9, nullptr, 10));
    at = LineEnd(at, end) + 1;
    while (at < end && *at != '\r') {
      const char* const lineEnd = LineEnd(at, end);
      KeepLine(std::string_view(at, static_cast<size_t>(lineEnd - at - 1)));
      at = lineEnd + 1;
    }
    Use(&m_map);
  }

  static const char* LineEnd(const char* at, const char* end) {
    return static_cast<const char*>(std::memchr(at, '\n', static_cast<size_t>(end - at)));
  }

  void KeepLine(std::string_view line) {
    const auto* const colon = static_cast<const char*>(std::memchr(line.data(), ':', line.size()));
    const std::string_view name = line.substr(0, static_cast<size_t>(colon - line.data()));
    const std::string_view value = line.substr(name.size() + 2);
    switch (name.size()) {
      case 10:
        if (Is(name, "Set-Cookie")) m_cookie = value.substr(0, value.find(';') + 1);
        break;
      case 12:
        if (Is(name, "Content-Type")) m_map.emplace(0, value);
        break;
      case 13:
        if (Is(name, "Content-Range")) m_map.emplace(2, value);
        break;
      case 14:
        if (Is(name, "Content-Length")) m_map.emplace(1, value);
        break;
      case 16:
        if (Is(name, "WWW-Authenticate")) m_challenge = value;
        break;
      case 17:
        if (Is(name, "Transfer-Encoding")) m_encoding = value;
        break;
      default:
        break;
    }
  }

  static bool Is(std::string_view name, const char* known) {
    return strncasecmp(name.data(), known, name.size()) == 0;
  }

  const std::string m_head = HeadOf30Lines();
  std::map<int, std::string> m_map;
  std::string m_cookie, m_challenge, m_encoding;
  int m_status = 0;
};

constexpr size_t kLinesSize = 60000;

std::string Lines() {
  std::string lines;
  for (int i = 0; lines.size() < kLinesSize; ++i) {
    lines +=
        "line of a list of recordings of a camera, number " + std::to_string(1000 + i) + "\r\n";
  }
  return lines;
}

class LineReading : public Operation {
 public:
  void Run(int count) override {
    char line[2048];
    for (int i = 0; i < count; ++i) {
      m_client.Memory()->RewindBuffered();
      for (size_t n = 0; n < m_lines; ++n) Use(line + m_client.ReadToLineEnd(line, sizeof(line)));
    }
  }

 private:
  const std::string m_text = Lines();
  const size_t m_lines = static_cast<size_t>(std::count(m_text.begin(), m_text.end(), '\n'));
  MemoryClient m_client{m_text};
};

class LineReadingFloor : public Operation {
 public:
  void Run(int count) override {
    char line[2048];
    for (int i = 0; i < count; ++i) {
      for (const char *at = m_text.data(), *const end = at + m_text.size(); at < end;) {
        const auto* const lineEnd =
            static_cast<const char*>(std::memchr(at, '\n', static_cast<size_t>(end - at)));
        const auto length = static_cast<size_t>(lineEnd - at - 1);
        std::memcpy(line, at, length);
        line[length] = '\0';
        Use(line);
        at = lineEnd + 1;
      }
    }
  }

 private:
  const std::string m_text = Lines();
};

}  // namespace

void AddHeadOperations(std::vector<Entry>* entries) {
  entries->push_back({"head_30", "head_30_floor", 200, HeadOf30Lines().size(), Make<Head>});
  entries->push_back({"head_30_floor", "", 200, HeadOf30Lines().size(), Make<HeadFloor>});
  entries->push_back({"lines", "lines_floor", 10, kLinesSize, Make<LineReading>});
  entries->push_back({"lines_floor", "", 10, kLinesSize, Make<LineReadingFloor>});
}
