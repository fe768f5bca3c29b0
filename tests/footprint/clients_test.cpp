// The memory of clients that wait for their next request.
#include <gtest/gtest.h>
#include <malloc.h>

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "tests/http/http_test_util.h"

namespace {

using Clients = std::vector<std::unique_ptr<ExposedClient>>;

struct Memory {
  size_t heap = 0;      // bytes that are allocated
  size_t resident = 0;  // bytes in memory that are no file's
};

size_t ResidentBytes() {
  const std::string status = ReadFile("/proc/self/status");
  size_t kilobytes = 0;
  const size_t at = status.find("RssAnon:");
  if (at != std::string::npos) sscanf(status.c_str() + at, "RssAnon: %zu", &kilobytes);
  return kilobytes * 1024;
}

Memory MemoryNow() {
  const struct mallinfo2 heap = mallinfo2();
  return {heap.uordblks + heap.hblkhd, ResidentBytes()};
}

constexpr size_t kFew = 1;
constexpr size_t kMany = 64;

// What `add` makes a client take, on the average of the 63 after the first, which also pays for
// what all of them share.
template <typename Add>
Memory PerFurtherClient(Add add) {
  Clients clients;
  clients.reserve(kMany);
  while (clients.size() < kFew) add(&clients);
  const Memory before = MemoryNow();
  while (clients.size() < kMany) add(&clients);
  const Memory after = MemoryNow();
  return {(after.heap - before.heap) / (kMany - kFew),
          (after.resident - before.resident) / (kMany - kFew)};
}

void Record(const Memory& memory) {
  ::testing::Test::RecordProperty("heap", std::to_string(memory.heap));
  if (!IsEmulated()) ::testing::Test::RecordProperty("resident", std::to_string(memory.resident));
}

// The 64 KiB that a client's socket reads ahead are all but 4 KiB of it.
constexpr size_t kMostHeap = 68 << 10;

TEST(IdleClient, TakesItsBufferAndLittleElse) {
  const Memory memory = PerFurtherClient(
      [](Clients* clients) { clients->push_back(std::make_unique<ExposedClient>(80)); });
  Record(memory);
  ::testing::Test::RecordProperty("object", std::to_string(sizeof(TWHttpClient)));
  ::testing::Test::RecordProperty("socket", std::to_string(sizeof(TWSocket)));
  EXPECT_LT(memory.heap, kMostHeap);
}

TEST(IdleClient, TakesNoMoreAfterASmallGet) {
  RepeatingPeer server(Exchange("HTTP/1.1 200 OK\r\nContent-Length: 16\r\n\r\n{\"success\":true}"));
  const Memory memory = PerFurtherClient([&server](Clients* clients) {
    clients->push_back(std::make_unique<ExposedClient>(server.Port()));
    std::string body;
    EXPECT_EQ(clients->back()->SendRequestByGet(), HTTP_RET_OK);
    EXPECT_EQ(clients->back()->ReadBody(body), HTTP_RET_OK);
  });
  Record(memory);
  EXPECT_LT(memory.heap, kMostHeap);
}

}  // namespace
