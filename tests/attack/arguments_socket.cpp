// Calls of twsocket.h and sslsocket.h.
#include "tests/attack/arguments_calls.h"

namespace {

// A buffer of just `size` bytes, so that a byte too many is seen.
class Buffer {
 public:
  explicit Buffer(unsigned size) : bytes_(new char[size]()) {}
  char* Get() const { return bytes_.get(); }

 private:
  std::unique_ptr<char[]> bytes_;
};

// The whole of a string's bytes, or a length that is refused.
struct Piece {
  char* bytes;
  int length;
};

Piece PieceOf(std::string* text, Draw& draw) {
  if (draw.OneIn(8)) return {nullptr, draw.Int()};
  if (draw.OneIn(8)) return {&(*text)[0], -1 - static_cast<int>(draw.Below(1000))};
  return {&(*text)[0], static_cast<int>(text->size())};
}

void ExpectCount(Ground& ground, int count, int most) {
  ground.Expect(count >= -1 && count <= std::max(most, 0), "a count that cannot be");
}

TWSocket::SELECT_TYPE SelectType(Draw& draw) {
  return draw.Bool() ? TWSocket::SELECT_READ : TWSocket::SELECT_WRITE;
}

void ConnectIt(Ground& ground, TWSocket& socket) {
  const int result = socket.Connect();
  ground.Expect(result <= 0, "a positive result");
  ground.Expect(socket.IsConnected() == (result == 0), "connected, or not, against the result");
}

void ReadRaw(Ground& ground, Draw& draw, TWSocket& socket) {
  const unsigned size = draw.Size();
  const Buffer buffer(size);
  ExpectCount(ground, socket._Read(buffer.Get(), size), static_cast<int>(size));
}

void WriteRaw(Ground& ground, Draw& draw, TWSocket& socket) {
  const std::string& text = draw.Text();
  const int result = socket._Write(text.data(), static_cast<unsigned>(text.size()));
  ExpectCount(ground, result, static_cast<int>(text.size()));
}

void Make(Ground& ground, Draw& /*draw*/) {
  ground.NewPlain(false);
}

void MakeWith(Ground& ground, Draw& /*draw*/) {
  ground.NewPlain(true);
}

void Drop(Ground& ground, Draw& /*draw*/) {
  ground.DropPlain();
}

void Connect(Ground& ground, Draw& /*draw*/) {
  ConnectIt(ground, ground.Plain());
}

void ConnectSocket(Ground& ground, Draw& /*draw*/) {
  const int result = ground.AnySocket().ConnectSocket();
  ground.Expect(result == 0 || result == -1, "neither 0 nor -1");
}

void PostConnect(Ground& ground, Draw& /*draw*/) {
  ground.Expect(ground.AnySocket().PostConnect() == 0, "not 0");
}

void Disconnect(Ground& ground, Draw& /*draw*/) {
  ground.Plain().Disconnect();
  ground.Expect(!ground.Plain().IsConnected(), "still connected");
}

void DoSelect(Ground& ground, Draw& draw) {
  ground.Expect(ground.Plain().DoSelect(SelectType(draw)) >= -1, "less than -1");
}

void Read(Ground& ground, Draw& draw) {
  ReadRaw(ground, draw, ground.Plain());
}

void Write(Ground& ground, Draw& draw) {
  WriteRaw(ground, draw, ground.Plain());
}

void SetSocketInfo(Ground& ground, Draw& draw) {
  TWSocket& socket = ground.AnySocket();
  const std::string host = ground.Host();
  socket.SetSocketInfo(host, ground.Port(false), draw.Seconds(), draw.Bool());
  ground.Expect(!socket.IsConnected(), "still connected");
}

void SetRemoteAddr(Ground& ground, Draw& draw) {
  ground.AnySocket().SetRemoteAddr(draw.Bool() ? 0 : draw.Unsigned());
}

void IsConnected(Ground& ground, Draw& draw) {
  std::string text = "text";
  if (!ground.Plain().IsConnected() && draw.Bool()) ground.Plain().WriteData(&text[0], 4);
}

void IsEof(Ground& ground, Draw& /*draw*/) {
  ground.Expect(!(TWSocket().IsEOF()), "an end without a stream");
  (void)ground.AnySocket().IsEOF();
}

void KeepAlive(Ground& ground, Draw& draw) {
  const int result =
      ground.AnySocket().SetKeepAliveOpt(draw.Int(), draw.Int(), draw.Int(), draw.Int());
  ground.Expect(result == 0 || result == -1, "neither 0 nor -1");
}

void ReadData(Ground& ground, Draw& draw) {
  const int size = static_cast<int>(draw.Size());
  const Buffer buffer(static_cast<unsigned>(size));
  TWSocket& socket = ground.AnySocket();
  if (draw.OneIn(8)) {
    const int length = draw.Int();
    ground.Expect(socket.ReadData(nullptr, length) == -1 || length == 0, "null was taken");
    ground.Expect(socket.ReadData(buffer.Get(), -1 - size) == -1, "a negative length was taken");
    return;
  }
  ExpectCount(ground, socket.ReadData(buffer.Get(), size), size);
}

void WriteData(Ground& ground, Draw& draw) {
  std::string text = draw.Text();
  const Piece piece = PieceOf(&text, draw);
  const int result = ground.AnySocket().WriteData(piece.bytes, piece.length);
  ExpectCount(ground, result, piece.length);
  ground.Expect(result == -1 || (piece.bytes != nullptr && piece.length > 0),
                "nothing was written");
}

void ReadToLineEnd(Ground& ground, Draw& draw) {
  const int size = static_cast<int>(draw.Size());
  const Buffer buffer(static_cast<unsigned>(size));
  TWSocket& socket = ground.AnySocket();
  if (draw.OneIn(8)) {
    ground.Expect(socket.ReadToLineEnd(nullptr, draw.Int()) == -1, "null was taken");
    ground.Expect(socket.ReadToLineEnd(buffer.Get(), -size) == -1, "no room was taken");
    return;
  }
  ExpectCount(ground, socket.ReadToLineEnd(buffer.Get(), size), size - 1);
}

void RestoreData(Ground& ground, Draw& draw) {
  std::string text = draw.Text();
  const Piece piece = PieceOf(&text, draw);
  const int result = ground.AnySocket().RestoreData(piece.bytes, piece.length);
  ground.Expect(result == 0 || result == -1, "neither 0 nor -1");
}

void HasDataToRead(Ground& ground, Draw& draw) {
  const int seconds = draw.Seconds();
  const bool has = ground.AnySocket().HasDataToRead(seconds);
  ground.Expect(!has || seconds >= 0, "a negative time-out returns true");
}

void MakeTls(Ground& ground, Draw& /*draw*/) {
  ground.NewTls(false);
}

void MakeTlsWith(Ground& ground, Draw& /*draw*/) {
  ground.NewTls(true);
}

void DropTls(Ground& ground, Draw& /*draw*/) {
  ground.DropTls();
}

void ConnectTls(Ground& ground, Draw& /*draw*/) {
  ConnectIt(ground, ground.Tls());
}

void DisconnectTls(Ground& ground, Draw& /*draw*/) {
  ground.Tls().Disconnect();
  ground.Expect(!ground.Tls().IsConnected(), "still connected");
}

void DoSelectTls(Ground& ground, Draw& draw) {
  ground.Expect(ground.Tls().DoSelect(SelectType(draw)) >= -1, "less than -1");
}

void ReadTls(Ground& ground, Draw& draw) {
  ReadRaw(ground, draw, ground.Tls());
}

void WriteTls(Ground& ground, Draw& draw) {
  WriteRaw(ground, draw, ground.Tls());
}

}  // namespace

std::vector<PublicCall> SocketCalls() {
  return {
      {"TWSocket::TWSocket", Make},
      {"TWSocket::TWSocket", MakeWith},
      {"TWSocket::~TWSocket", Drop},
      {"TWSocket::Connect", Connect},
      {"TWSocket::ConnectSocket", ConnectSocket},
      {"TWSocket::PostConnect", PostConnect},
      {"TWSocket::Disconnect", Disconnect},
      {"TWSocket::DoSelect", DoSelect},
      {"TWSocket::_Read", Read},
      {"TWSocket::_Write", Write},
      {"TWSocket::SetSocketInfo", SetSocketInfo},
      {"TWSocket::SetRemoteAddr", SetRemoteAddr},
      {"TWSocket::IsConnected", IsConnected},
      {"TWSocket::IsEOF", IsEof},
      {"TWSocket::SetKeepAliveOpt", KeepAlive},
      {"TWSocket::ReadData", ReadData},
      {"TWSocket::WriteData", WriteData},
      {"TWSocket::ReadToLineEnd", ReadToLineEnd},
      {"TWSocket::RestoreData", RestoreData},
      {"TWSocket::HasDataToRead", HasDataToRead},
      {"SSLSocket::SSLSocket", MakeTls},
      {"SSLSocket::SSLSocket", MakeTlsWith},
      {"SSLSocket::~SSLSocket", DropTls},
      {"SSLSocket::Connect", ConnectTls},
      {"SSLSocket::Disconnect", DisconnectTls},
      {"SSLSocket::DoSelect", DoSelectTls},
      {"SSLSocket::_Read", ReadTls},
      {"SSLSocket::_Write", WriteTls},
  };
}
