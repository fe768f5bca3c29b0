// What a socket leaves in its read-ahead buffer for the next connection.
#include <algorithm>
#include <memory>

#include "tarnwick/net/socket_access.h"
#include "tests/net/net_test_util.h"

using namespace tarnwick;

namespace {

// The fields of a socket that is of no derived class.
struct Fields : TWSocket {
  static char* Buffer(TWSocket* socket) { return socket->*(&Fields::m_readBuf); }
  static int& Fd(TWSocket* socket) { return socket->*(&Fields::m_sockFd); }
  static size_t Used(TWSocket* socket) {
    return static_cast<size_t>(socket->*(&Fields::m_readPos) + socket->*(&Fields::m_readLen));
  }
};

bool IsZeroFrom(TWSocket* socket, size_t from) {
  const char* const begin = Fields::Buffer(socket);
  return std::all_of(begin + from, begin + 65536, [](char byte) { return byte == 0; });
}

// Connects the socket to the peer whose descriptor is the result.
int ConnectToPeer(TWSocket* socket) {
  int ends[2] = {-1, -1};
  EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
  Fields::Fd(socket) = ends[0];
  socket->PostConnect();
  return ends[1];
}

void PeerSends(int peer, const std::string& bytes) {
  EXPECT_EQ(send(peer, bytes.data(), bytes.size(), MSG_NOSIGNAL),
            static_cast<ssize_t>(bytes.size()));
}

TEST(Clearing, SetSocketInfoLeavesNothingOfAnEarlierConnection) {
  const auto socket = std::make_unique<TWSocket>("pair", 0, 0, true);
  const int peer = ConnectToPeer(socket.get());
  PeerSends(peer, std::string(60000, 's'));
  EXPECT_EQ(ReadSome(*socket, 10).result, 10);
  socket->SetSocketInfo("other", 1, 2, true);
  EXPECT_TRUE(IsZeroFrom(socket.get(), 0));
  close(peer);
}

TEST(Clearing, WhatDirectModeLeftGoesWithTheNextBufferedConnection) {
  const auto socket = std::make_unique<TWSocket>("pair", 0, 0, true);
  const int peer = ConnectToPeer(socket.get());
  PeerSends(peer, std::string(5000, 's'));
  EXPECT_EQ(ReadSome(*socket, 10).result, 10);
  socket->SetSocketInfo("direct", 1, 2, false);
  socket->Disconnect();
  EXPECT_EQ(Fields::Buffer(socket.get())[4999], 's');
  socket->SetSocketInfo("buffered", 1, 2, true);
  EXPECT_TRUE(IsZeroFrom(socket.get(), 0));
  close(peer);
}

// A read that says less than it wrote, as one that decodes in place does.
class Scribbler : public PairedSocket {
 public:
  Scribbler() : PairedSocket(0, true) {}
  int _Read(void* buf, unsigned int len) override {
    memset(buf, 's', len);
    return 1;
  }
};

TEST(Clearing, IsOfTheWholeBuffer) {
  const auto socket = std::make_unique<Scribbler>();
  EXPECT_EQ(ReadSome(*socket, 1), (Delivered{1, "s"}));
  socket->m_readBuf[65535] = 's';
  socket->Disconnect();
  EXPECT_TRUE(IsZeroFrom(socket.get(), 0));
}

TEST(Clearing, TheClientsSocketForgetsWhatItReadThoughNothingIsCleared) {
  const std::unique_ptr<TWSocket> socket(SocketAccess::MakePlain());
  const ExposedSocket fresh;
  EXPECT_EQ(Fields::Fd(socket.get()), fresh.m_sockFd);
  EXPECT_EQ(Fields::Used(socket.get()), 0u);
  EXPECT_FALSE(socket->IsConnected() || socket->IsEOF());
  socket->SetSocketInfo("pair", 0, 0, true);
  const int peer = ConnectToPeer(socket.get());
  PeerSends(peer, std::string(3000, 's'));
  EXPECT_EQ(ReadSome(*socket, 10).result, 10);
  socket->Disconnect();
  EXPECT_EQ(Fields::Used(socket.get()), 0u);
  close(peer);
}

}  // namespace
