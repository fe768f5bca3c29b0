// A client whose server is a string in memory, for what is parsed without a network.
#ifndef TARNWICK_BENCH_MEMORY_CLIENT_H_
#define TARNWICK_BENCH_MEMORY_CLIENT_H_

#include <algorithm>
#include <cstring>
#include <string>
#include <utility>

#include "tarnwick/http/twhttp.h"

class MemorySocket : public TWSocket {
 public:
  explicit MemorySocket(std::string bytes)
      : TWSocket("memory", 0, 1, true), m_bytes(std::move(bytes)) {}

  // Lets all of the bytes come again.
  void Rewind() {
    m_taken = 0;
    m_readPos = 0;
    m_readLen = 0;
  }

  // As Rewind, with the bytes in the read-ahead buffer already. REQUIRES: they fit, and nothing has
  // been read ahead since the first call.
  void RewindBuffered() {
    if (m_taken == 0) m_taken = m_bytes.copy(m_readBuf, sizeof(m_readBuf));
    m_readPos = 0;
    m_readLen = static_cast<int>(m_taken);
  }

  int DoSelect(SELECT_TYPE /*type*/) override { return 1; }

  int _Read(void* buf, unsigned int len) override {
    const size_t count = std::min<size_t>(len, m_bytes.size() - m_taken);
    std::memcpy(buf, m_bytes.data() + m_taken, count);
    m_taken += count;
    return static_cast<int>(count);
  }

 private:
  const std::string m_bytes;
  size_t m_taken = 0;
};

class MemoryClient : public TWHttpClient {
 public:
  explicit MemoryClient(const std::string& bytes) : m_memory(new MemorySocket(bytes)) {
    m_pSocket = m_memory;
  }

  MemorySocket* Memory() { return m_memory; }

  // Puts the client after the head of a response with this Transfer-Encoding.
  void SetAfterHead(const std::string& encoding) {
    m_connState = 2;
    m_strTransferEncoding = encoding;
  }

  int ParseHead() {
    m_connState = 1;
    return CheckHttpResponse();
  }

 private:
  MemorySocket* m_memory;
};

#endif  // TARNWICK_BENCH_MEMORY_CLIENT_H_
