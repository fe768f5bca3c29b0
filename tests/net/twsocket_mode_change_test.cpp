// A socket that was set up anew for direct reading keeps what an earlier connection had read ahead,
// because nobody looks at it in that mode: no way of reading may take it for bytes of the new one.
#include "tests/net/net_test_util.h"

TEST(DirectMode, ALineHasNothingOfWhatWasReadAheadBefore) {
  ScriptedSocket socket(false, {Returns("n"), Returns("e"), Returns("w"), Returns("\n")});
  socket.Buffer("old\nolder\n");
  EXPECT_EQ(ReadLine(socket), (Delivered{3, "new"}));
  EXPECT_TRUE(socket.ScriptEnded());
  EXPECT_EQ(socket.Unread(), "old\nolder\n");
}

TEST(DirectMode, ACrlfThatWasReadAheadBeforeDoesNotEndALine) {
  ScriptedSocket socket(false, {Returns("a"), Returns("\r"), Returns("\n")});
  socket.Buffer("\r\n\r\n");
  EXPECT_EQ(ReadLine(socket), (Delivered{1, "a"}));
  EXPECT_EQ(socket.Unread(), "\r\n\r\n");
}

TEST(DirectMode, DisconnectingLeavesWhatWasReadAheadBefore) {
  ScriptedSocket socket(false, {});
  socket.Buffer("old", 5);
  socket.m_sockFd = -1;
  socket.Disconnect();
  EXPECT_EQ(socket.Unread(), "old");
  EXPECT_EQ(socket.m_readPos, 5);
}
