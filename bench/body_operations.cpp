// Bodies out of memory, chunked and not, and the line ends of a SOAP reply.
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "bench/memory_client.h"
#include "bench/operations.h"
#include "tarnwick/utils/utils.h"

namespace {

constexpr size_t kMiB = size_t{1} << 20;

std::string Chunked(size_t size, size_t chunk) {
  std::string body;
  char line[32];
  std::snprintf(line, sizeof(line), "%zx\r\n", chunk);
  for (size_t done = 0; done < size; done += chunk) body += line + std::string(chunk, 'x') + "\r\n";
  return body + "0\r\n\r\n";
}

class Body : public Operation {
 public:
  Body(const std::string& bytes, const char* encoding) : m_client(bytes), m_encoding(encoding) {}

  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      m_client.Memory()->Rewind();
      m_client.SetBehindHead(m_encoding);
      std::string body;
      if (m_client.ReadBody(body) != HTTP_RET_OK || body.size() < kMiB) std::abort();
      Use(body.data());
    }
  }

 private:
  MemoryClient m_client;
  const char* m_encoding;
};

template <size_t kChunk>
class ChunkedBody : public Body {
 public:
  ChunkedBody() : Body(Chunked(kMiB, kChunk), "chunked") {}
};

template <size_t kSize>
class PlainBody : public Body {
 public:
  PlainBody() : Body(std::string(kSize, 'x'), "") {}
};

// One pass over the chunks, each appended to the body.
template <size_t kChunk>
class ChunkedFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) Decode();
  }

 private:
  void Decode() const {
    std::string body;
    const char* at = m_bytes.data();
    const char* const end = at + m_bytes.size();
    for (;;) {
      char* digitsEnd = nullptr;
      const size_t size = std::strtoul(at, &digitsEnd, 16);
      at = static_cast<const char*>(std::memchr(at, '\n', static_cast<size_t>(end - at))) + 1;
      if (size == 0) break;
      body.append(at, size);
      at += size + 2;
    }
    Use(body.data());
  }

  const std::string m_bytes = Chunked(kMiB, kChunk);
};

// Appending pieces of 8 KiB as they come.
template <size_t kSize>
class AppendFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      m_socket.Rewind();
      std::string body;
      char piece[8192];
      for (int n; (n = m_socket.ReadData(piece, sizeof(piece))) > 0;) {
        body.append(piece, static_cast<size_t>(n));
      }
      Use(body.data());
    }
  }

 private:
  MemorySocket m_socket{std::string(kSize, 'x')};
};

// An envelope as devices send it: a line of 80 bytes, an indented one of 30, and so on.
std::string SoapReply(size_t size) {
  std::string reply;
  while (reply.size() < size) {
    reply +=
        "<tt:Profile token=\"profile_1\" fixed=\"true\"><tt:Name>main</tt:Name></tt:Profile>\r\n";
    reply += "        <tt:UseCount>2</tt:UseCount>\r\n";
  }
  return reply;
}

class LineEnds : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      std::string reply = m_reply;
      RemoveChar(reply, '\r');
      RemoveChar(reply, '\n');
      Use(reply.data());
    }
  }

 private:
  const std::string m_reply = SoapReply(kMiB);
};

class LineEndsFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      std::string reply = m_reply;
      Remove(&reply, '\r');
      Remove(&reply, '\n');
      Use(reply.data());
    }
  }

 private:
  static void Remove(std::string* text, char ch) {
    char* out = &(*text)[0];
    const char* at = out;
    const char* const end = at + text->size();
    while (at < end) {
      const auto* found =
          static_cast<const char*>(std::memchr(at, ch, static_cast<size_t>(end - at)));
      if (found == nullptr) found = end;
      std::memmove(out, at, static_cast<size_t>(found - at));
      out += found - at;
      at = found + 1;
    }
    text->resize(static_cast<size_t>(out - text->data()));
  }

  const std::string m_reply = SoapReply(kMiB);
};

}  // namespace

void AddBodyOperations(std::vector<Entry>* entries) {
  entries->push_back({"chunked_64", "chunked_64_floor", 3, kMiB, Make<ChunkedBody<64>>});
  entries->push_back({"chunked_64_floor", "", 3, kMiB, Make<ChunkedFloor<64>>});
  entries->push_back({"chunked_4k", "chunked_4k_floor", 5, kMiB, Make<ChunkedBody<4096>>});
  entries->push_back({"chunked_4k_floor", "", 5, kMiB, Make<ChunkedFloor<4096>>});
  entries->push_back({"body_1m", "body_1m_floor", 5, kMiB, Make<PlainBody<kMiB>>});
  entries->push_back({"body_1m_floor", "", 5, kMiB, Make<AppendFloor<kMiB>>});
  entries->push_back({"body_64m", "body_64m_floor", 1, 64 * kMiB, Make<PlainBody<64 * kMiB>>});
  entries->push_back({"body_64m_floor", "", 1, 64 * kMiB, Make<AppendFloor<64 * kMiB>>});
  entries->push_back({"line_ends_1m", "line_ends_1m_floor", 3, kMiB, Make<LineEnds>});
  entries->push_back({"line_ends_1m_floor", "", 3, kMiB, Make<LineEndsFloor>});
}
