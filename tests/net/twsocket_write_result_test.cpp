// What a write tells about the connection. Only a negative result of the raw write does: a plain
// socket's is never negative, and callers compare the count.
#include "tests/net/net_test_util.h"

TEST(WriteResult, AWriteThatTookNothingOrAPartLeavesConnected) {
  for (const int taken : {0, 4}) {
    ScriptedSocket socket(true, {});
    socket.AnswerWrite({taken, 0, ""});
    EXPECT_EQ(socket.WriteData("hello", 5), taken);
    EXPECT_TRUE(socket.IsConnected()) << taken;
  }
}

TEST(WriteResult, APlainWriteToAPeerThatIsGoneReturnsZeroAndLeavesConnected) {
  PairedSocket socket(5, true);
  socket.ClosePeer();
  EXPECT_EQ(socket.WriteData("hello", 5), 0);
  EXPECT_TRUE(socket.IsConnected());
}

TEST(WriteResult, ANegativeResultIsReturnedAsItIs) {
  ScriptedSocket socket(true, {});
  socket.AnswerWrite({-7, 0, ""});
  EXPECT_EQ(socket.WriteData("hello", 5), -7);
  EXPECT_FALSE(socket.IsConnected());
}
