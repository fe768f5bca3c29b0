// Bodies out of memory, chunked and not, and the line ends of a SOAP reply.
#include <cstdlib>

#include "bench/memory_client.h"
#include "bench/operations.h"
#include "bench/plain.h"
#include "bench/texts.h"
#include "tarnwick/utils/utils.h"

namespace {

constexpr size_t kMiB = size_t{1} << 20;

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
  ChunkedBody() : Body(Chunked(std::string(kMiB, 'x'), kChunk), "chunked") {}
};

template <size_t kSize>
class PlainBody : public Body {
 public:
  PlainBody() : Body(std::string(kSize, 'x'), "") {}
};

template <size_t kChunk>
class ChunkedFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) Use(Dechunked(m_bytes).data());
  }

 private:
  const std::string m_bytes = Chunked(std::string(kMiB, 'x'), kChunk);
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
      RemovePlainly(&reply, '\r');
      RemovePlainly(&reply, '\n');
      Use(reply.data());
    }
  }

 private:
  const std::string m_reply = SoapReply(kMiB);
};

}  // namespace

void AddBodyOperations(std::vector<Entry>* entries) {
  entries->push_back({"chunked_64", "chunked_64_floor", 4, kMiB, Make<ChunkedBody<64>>});
  entries->push_back({"chunked_64_floor", "", 4, kMiB, Make<ChunkedFloor<64>>});
  entries->push_back({"chunked_4k", "chunked_4k_floor", 4, kMiB, Make<ChunkedBody<4096>>});
  entries->push_back({"chunked_4k_floor", "", 4, kMiB, Make<ChunkedFloor<4096>>});
  entries->push_back({"body_1m", "body_1m_floor", 4, kMiB, Make<PlainBody<kMiB>>});
  entries->push_back({"body_1m_floor", "", 4, kMiB, Make<AppendFloor<kMiB>>});
  entries->push_back({"body_64m", "body_64m_floor", 1, 64 * kMiB, Make<PlainBody<64 * kMiB>>});
  entries->push_back({"body_64m_floor", "", 1, 64 * kMiB, Make<AppendFloor<64 * kMiB>>});
  entries->push_back({"line_ends_1m", "line_ends_1m_floor", 4, kMiB, Make<LineEnds>});
  entries->push_back({"line_ends_1m_floor", "", 4, kMiB, Make<LineEndsFloor>});
}
