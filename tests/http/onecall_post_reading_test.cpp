// How SendHttpPost reads the head of the response: ahead, as a system call a byte would cost too
// much.
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

TEST(SendHttpPostReading, ItReadsAhead) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 2\r\n\r\n{}")});
  Faults faults;
  EXPECT_EQ(SendHttpPost("127.0.0.1", peer.Port(), "api", "a=1", "s=1", 5), 0);
  ASSERT_FALSE(faults.Sizes(Call::kRead).empty());
  for (const size_t size : faults.Sizes(Call::kRead)) EXPECT_EQ(size, 64512u);
}
