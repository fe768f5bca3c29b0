// The socket object itself: its fields, its settings, and how it is closed.
#include <algorithm>
#include <cstring>
#include <memory>
#include <new>
#include <vector>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/process.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// A socket made in memory that is full of rubbish.
template <typename... Args>
class SocketInDirtyMemory {
 public:
  explicit SocketInDirtyMemory(Args... args) : memory_(sizeof(ExposedSocket), '\xaa') {
    socket_ = new (memory_.data()) ExposedSocket(args...);
  }
  ~SocketInDirtyMemory() { socket_->~ExposedSocket(); }
  ExposedSocket* operator->() const { return socket_; }

 private:
  std::vector<char> memory_;
  ExposedSocket* socket_;
};

template <typename Socket>
bool ReadBufferIsZero(Socket& socket) {
  return std::all_of(socket->m_readBuf, socket->m_readBuf + sizeof(socket->m_readBuf),
                     [](char byte) { return byte == 0; });
}

TEST(SocketObject, StartsWithoutASocketAHostAPortOrATimeOut) {
  ExposedSocket socket;
  EXPECT_EQ(socket.m_sockFd, -1);
  EXPECT_EQ(socket.m_strHost, "");
  EXPECT_EQ(socket.m_port, -1);
  EXPECT_EQ(socket.m_timeout, -1);
  EXPECT_FALSE(socket.m_bBuffered);
  EXPECT_FALSE(socket.m_bConnected);
  EXPECT_FALSE(socket.m_bEOF);
  EXPECT_EQ(socket.m_srcAddr, 0u);
}

TEST(SocketObject, StoresTheFourValuesThatItIsMadeWith) {
  ExposedSocket socket("camera.example", 554, 7, true);
  EXPECT_EQ(socket.m_sockFd, -1);
  EXPECT_EQ(socket.m_strHost, "camera.example");
  EXPECT_EQ(socket.m_port, 554);
  EXPECT_EQ(socket.m_timeout, 7);
  EXPECT_TRUE(socket.m_bBuffered);
  EXPECT_FALSE(socket.m_bConnected);
  EXPECT_FALSE(socket.m_bEOF);
  EXPECT_EQ(socket.m_srcAddr, 0u);
}

TEST(SocketObject, StartsWithAZeroedReadBuffer) {
  SocketInDirtyMemory<> bare;
  EXPECT_TRUE(ReadBufferIsZero(bare));
  EXPECT_EQ(bare->m_readPos, 0);
  EXPECT_EQ(bare->m_readLen, 0);
  SocketInDirtyMemory<const char*, int, int, bool> given("host", 1, 2, false);
  EXPECT_TRUE(ReadBufferIsZero(given));
  EXPECT_EQ(given->m_readPos, 0);
  EXPECT_EQ(given->m_readLen, 0);
}

TEST(SocketObject, HoldsABufferOf65536BytesInline) {
  EXPECT_EQ(sizeof(ExposedSocket::m_readBuf), 65536u);
  EXPECT_GT(sizeof(TWSocket), 65536u);
  EXPECT_LT(sizeof(TWSocket), 65536u + 128u);
}

TEST(SocketObject, KeepsItsFieldsInTheDeclaredOrder) {
  ExposedSocket socket;
  const std::vector<const void*> fields = {
      &socket.m_sockFd,    &socket.m_strHost,    &socket.m_port,   &socket.m_timeout,
      &socket.m_bBuffered, &socket.m_bConnected, &socket.m_bEOF,   &socket.m_readBuf,
      &socket.m_readPos,   &socket.m_readLen,    &socket.m_srcAddr};
  EXPECT_TRUE(std::is_sorted(fields.begin(), fields.end()));
}

TEST(SocketObject, KeepsTheTlsFieldsAfterTheBase) {
  EXPECT_GE(sizeof(SSLSocket), sizeof(TWSocket) + 2 * sizeof(void*));
  EXPECT_LE(sizeof(SSLSocket), sizeof(TWSocket) + 3 * sizeof(void*));
}

// The slot of a virtual function, from the representation that the C++ ABI has for its pointer.
template <typename Pointer>
size_t Slot(Pointer function) {
  uintptr_t word;
  memcpy(&word, &function, sizeof(word));
  return (word & ~uintptr_t{1}) / sizeof(void*);
}

TEST(SocketObject, KeepsTheVirtualCallsInTheirSlots) {
  const std::vector<size_t> slots = {Slot(&TWSocket::Connect),    Slot(&TWSocket::PostConnect),
                                     Slot(&TWSocket::Disconnect), Slot(&TWSocket::DoSelect),
                                     Slot(&TWSocket::_Read),      Slot(&TWSocket::_Write)};
  EXPECT_THAT(slots, ElementsAre(2, 3, 4, 5, 6, 7));  // the destructor has the first two
}

TEST(SocketObject, KeepsTheVirtualCallsOfTlsInTheSameSlots) {
  const std::vector<size_t> slots = {Slot(&SSLSocket::Connect), Slot(&SSLSocket::Disconnect),
                                     Slot(&SSLSocket::DoSelect), Slot(&SSLSocket::_Read),
                                     Slot(&SSLSocket::_Write)};
  EXPECT_THAT(slots, ElementsAre(2, 4, 5, 6, 7));
}

TEST(SocketObject, ReturnsItsFlags) {
  ExposedSocket socket;
  socket.m_bConnected = true;
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_FALSE(socket.IsEOF());
  socket.m_bConnected = false;
  socket.m_bEOF = true;
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_TRUE(socket.IsEOF());
}

TEST(SetRemoteAddr, StoresTheSourceAddress) {
  ExposedSocket socket;
  socket.SetRemoteAddr(0x0100007f);
  EXPECT_EQ(socket.m_srcAddr, 0x0100007fu);
  socket.SetRemoteAddr(0);
  EXPECT_EQ(socket.m_srcAddr, 0u);
}

TEST(SetSocketInfo, StoresTheNewSettings) {
  ExposedSocket socket("old", 1, 2, false);
  socket.SetSocketInfo("new", 3, 4, true);
  EXPECT_EQ(socket.m_strHost, "new");
  EXPECT_EQ(socket.m_port, 3);
  EXPECT_EQ(socket.m_timeout, 4);
  EXPECT_TRUE(socket.m_bBuffered);
}

TEST(SetSocketInfo, ClearsTheFlagsAndClosesAnOpenSocket) {
  PairedSocket socket(5, false);
  socket.m_bEOF = true;
  const int fd = socket.m_sockFd;
  socket.SetSocketInfo("new", 3, 4, false);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_FALSE(socket.IsEOF());
  EXPECT_EQ(socket.m_sockFd, -1);
  EXPECT_FALSE(IsOpenFd(fd));
}

TEST(SetSocketInfo, KeepsTheSourceAddress) {
  ExposedSocket socket;
  socket.SetRemoteAddr(0x0200007f);
  socket.SetSocketInfo("new", 3, 4, true);
  EXPECT_EQ(socket.m_srcAddr, 0x0200007fu);
}

TEST(SetSocketInfo, ZeroesTheReadBufferOfABufferedSocket) {
  auto socket = std::make_unique<ExposedSocket>("old", 1, 2, false);
  socket->Buffer("left over", 3);
  socket->SetSocketInfo("new", 3, 4, true);
  EXPECT_TRUE(ReadBufferIsZero(socket));
  EXPECT_EQ(socket->m_readPos, 0);
  EXPECT_EQ(socket->m_readLen, 0);
}

TEST(SetSocketInfo, LeavesTheReadBufferAloneForADirectSocket) {
  ExposedSocket socket("old", 1, 2, true);
  socket.Buffer("left over", 3);
  socket.SetSocketInfo("new", 3, 4, false);
  EXPECT_EQ(socket.m_readPos, 3);
  EXPECT_EQ(socket.Unread(), "left over");
}

TEST(SetSocketInfo, WithoutAnOpenSocketClosesNothing) {
  ExposedSocket socket;
  Faults faults;
  socket.SetSocketInfo("new", 3, 4, true);
  EXPECT_EQ(faults.Count(Call::kClose), 0);
}

TEST(Disconnect, ClosesTheSocketAndClearsConnected) {
  PairedSocket socket(5, true);
  const int fd = socket.m_sockFd;
  socket.Disconnect();
  EXPECT_FALSE(IsOpenFd(fd));
  EXPECT_EQ(socket.m_sockFd, -1);
  EXPECT_FALSE(socket.IsConnected());
  char byte;
  EXPECT_EQ(recv(socket.Peer(), &byte, 1, 0), 0);
}

TEST(Disconnect, LeavesEndOfFileAsItIs) {
  PairedSocket socket(5, true);
  socket.m_bEOF = true;
  socket.Disconnect();
  EXPECT_TRUE(socket.IsEOF());
}

TEST(Disconnect, ZeroesTheReadBufferOfABufferedSocket) {
  auto socket = std::make_unique<PairedSocket>(5, true);
  socket->Buffer("read ahead", 2);
  socket->Disconnect();
  EXPECT_TRUE(ReadBufferIsZero(socket));
  EXPECT_EQ(socket->m_readPos, 0);
  EXPECT_EQ(socket->m_readLen, 0);
}

TEST(Disconnect, LeavesTheReadBufferOfADirectSocketAlone) {
  PairedSocket socket(5, false);
  socket.Buffer("left over", 2);
  socket.Disconnect();
  EXPECT_EQ(socket.Unread(), "left over");
}

TEST(Disconnect, WithoutASocketClosesNothing) {
  ExposedSocket socket;
  socket.m_bConnected = true;
  Faults faults;
  socket.Disconnect();
  EXPECT_EQ(faults.Count(Call::kClose), 0);
  EXPECT_FALSE(socket.IsConnected());
}

TEST(Disconnect, ClosesDescriptorZeroToo) {
  const ChildResult child = RunInChild([] {
    ExposedSocket socket;
    socket.m_sockFd = 0;
    socket.Disconnect();
    EXPECT_EQ(socket.m_sockFd, -1);
    EXPECT_FALSE(IsOpenFd(0));
    return 0;
  });
  EXPECT_EQ(child.code, 0);
}

TEST(SocketDestructor, ClosesTheDescriptor) {
  auto socket = std::make_unique<PairedSocket>(5, true);
  const int fd = socket->m_sockFd;
  socket.reset();
  EXPECT_FALSE(IsOpenFd(fd));
}

TEST(SocketDestructor, WithoutASocketClosesNothing) {
  Faults faults;
  { ExposedSocket socket; }
  EXPECT_EQ(faults.Count(Call::kClose), 0);
}

TEST(PostConnect, MakesASocketWithATimeOutNonBlocking) {
  for (const int timeout : {0, 1, 3600}) {
    PairedSocket socket(-1, true);
    ASSERT_FALSE(IsNonBlocking(socket.m_sockFd));
    socket.m_timeout = timeout;
    EXPECT_EQ(socket.PostConnect(), 0);
    EXPECT_TRUE(IsNonBlocking(socket.m_sockFd)) << timeout;
  }
}

TEST(PostConnect, MakesASocketWithoutATimeOutBlocking) {
  for (const int timeout : {-1, -30}) {
    PairedSocket socket(5, true);
    ASSERT_TRUE(IsNonBlocking(socket.m_sockFd));
    socket.m_timeout = timeout;
    EXPECT_EQ(socket.PostConnect(), 0);
    EXPECT_FALSE(IsNonBlocking(socket.m_sockFd)) << timeout;
  }
}

TEST(PostConnect, ReturnsZeroWhenTheModeCannotBeSet) {
  LogCapture log;
  PairedSocket socket(5, true);
  Faults faults;
  faults.FailFrom(Call::kIoctl, 1);
  EXPECT_EQ(socket.PostConnect(), 0);
  EXPECT_EQ(ExposedSocket().PostConnect(), 0);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

}  // namespace
