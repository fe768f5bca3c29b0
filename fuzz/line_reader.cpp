// A sequence of reads, line reads and push-backs on one socket. The first line holds the options
// and read sizes, the second one the operations, each a letter with a number:
//
//   buffered 5
//   L16 R3 P2 L80 H1 R2000 W4 C D
//   what the peer sends
//
// L reads a line into a buffer of that size, R reads bytes, P pushes back the last bytes read (made
// up ones when there are none), W writes, H asks for data, C connects anew (from an address of that
// number), D disconnects, S sets the socket up again (buffered unless the number is 0), K switches
// keep-alive, N passes what no caller should.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/oracle/shared/model_socket.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "fuzz/support/wire.h"
#include "tarnwick/net/twsocket.h"

namespace {

constexpr int kMostOperations = 64;
constexpr int kMostBytes = 70000;

class Socket : public TWSocket {
 public:
  Socket(int timeout, bool buffered) : TWSocket("cam", 80, timeout, buffered) {}

  bool Buffered() const { return m_bBuffered; }

  std::string Unread() const {
    return std::string(m_readBuf + m_readPos, static_cast<size_t>(m_readLen));
  }
};

// Plays each operation on the library's socket and on the model's.
class Game {
 public:
  Game(Socket* socket, ModelSocket* model) : socket_(socket), model_(model) {}

  void Play(char operation, int number);
  void CompareState();

 private:
  void Read(int size);
  void ReadLine(int size);
  void PushBack(size_t size);
  void Write(int size);
  void Misuse();

  Socket* socket_;
  ModelSocket* model_;
  std::string last_;  // what was read
};

void Game::Read(int size) {
  // Of exactly the size, so that a byte too many is an error.
  const std::unique_ptr<char[]> buf(new char[static_cast<size_t>(size)]);
  const int expected = model_->Read(size, &last_);
  const int got = socket_->ReadData(buf.get(), size);
  ExpectSame("ReadData", got, expected);
  if (got < 0) last_.clear();
  ExpectSame("bytes read", std::string(buf.get(), static_cast<size_t>(std::max(got, 0))), last_);
}

void Game::ReadLine(int size) {
  size = std::max(size, 1);
  const std::unique_ptr<char[]> buf(new char[static_cast<size_t>(size)]);
  last_.clear();
  const int expected = model_->ReadLine(size, &last_);
  const int got = socket_->ReadToLineEnd(buf.get(), size);
  ExpectSame("ReadToLineEnd", got, expected);
  if (got < 0) return;
  ExpectSame("line", std::string(buf.get(), static_cast<size_t>(got)), last_);
  ExpectSame("terminating byte", buf[static_cast<size_t>(got)], 0);
}

void Game::PushBack(size_t size) {
  std::string data =
      last_.size() < size ? std::string(size, '#') : last_.substr(last_.size() - size);
  ExpectSame("RestoreData", socket_->RestoreData(data.data(), static_cast<int>(size)),
             model_->Restore(data));
}

void Game::Write(int size) {
  const std::string data(static_cast<size_t>(size), 'w');
  ExpectSame("WriteData", socket_->WriteData(data.data(), size), model_->Write(data));
}

void Game::Misuse() {
  char byte = 0;
  const int restored = socket_->Buffered() ? -1 : 0;
  ExpectSame("ReadData into nothing", socket_->ReadData(nullptr, 1), -1);
  ExpectSame("ReadData of a negative length", socket_->ReadData(&byte, -1), -1);
  ExpectSame("ReadToLineEnd into nothing", socket_->ReadToLineEnd(nullptr, 1), -1);
  ExpectSame("ReadToLineEnd without room", socket_->ReadToLineEnd(&byte, 0), -1);
  ExpectSame("RestoreData of nothing", socket_->RestoreData(nullptr, 1), restored);
  ExpectSame("RestoreData of a negative length", socket_->RestoreData(&byte, -1), restored);
  ExpectSame("WriteData of nothing", socket_->WriteData(nullptr, 1), -1);
}

void Game::Play(char operation, int number) {
  switch (operation) {
    case 'L':
      return ReadLine(number);
    case 'R':
      return Read(number);
    case 'P':
      return PushBack(static_cast<size_t>(number));
    case 'W':
      return Write(number);
    case 'H':
      return ExpectSame("HasDataToRead", static_cast<int64_t>(socket_->HasDataToRead(number - 1)),
                        static_cast<int64_t>(model_->HasData(number - 1)));
    case 'N':
      return Misuse();
    case 'S':
      model_->SetUp(number != 0);
      return socket_->SetSocketInfo("cam", 80, model_->Timeout(), number != 0);
    case 'K':
      return ExpectSame("SetKeepAliveOpt", socket_->SetKeepAliveOpt(number % 2, 60, 10, 3),
                        model_->IsOpen() ? 0 : -1);
    case 'C':
      socket_->SetRemoteAddr(static_cast<unsigned>(number));
      return ExpectSame("Connect", socket_->Connect(), model_->Connect());
    case 'D':
      model_->Disconnect();
      return socket_->Disconnect();
    default:
      return;
  }
}

void Game::CompareState() {
  ExpectSame("IsEOF", static_cast<int64_t>(socket_->IsEOF()),
             static_cast<int64_t>(model_->IsEof()));
  ExpectSame("IsConnected", static_cast<int64_t>(socket_->IsConnected()),
             static_cast<int64_t>(model_->IsConnected()));
  ExpectSame("unread bytes", socket_->Unread(), model_->Unread());
}

void PlayAll(std::string_view operations, Game* game) {
  const std::string text(operations);
  const char* at = text.c_str();
  for (int i = 0; i < kMostOperations && *at != '\0'; ++i) {
    const char operation = *at++;
    char* end = nullptr;
    const long number = std::strtol(at, &end, 10);
    at = end;
    game->Play(operation, static_cast<int>(std::clamp(number, 0l, long{kMostBytes})));
    game->CompareState();
  }
}

// The library made the same reads as the model, so it waited as often as well.
void CompareReads(const Wire& wire, const ModelSocket& model) {
  ExpectSame("connects", static_cast<int64_t>(wire.Dialled().size()),
             static_cast<int64_t>(model.Dialled().size()));
  for (size_t i = 0; i < wire.Dialled().size(); ++i) {
    ExpectSame("sizes of the reads", wire.Dialled()[i].Reads(), model.Dialled()[i].Reads());
    ExpectSame("bytes written", wire.Dialled()[i].Written(), model.Dialled()[i].Written());
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  LogEverything();
  std::string_view text(reinterpret_cast<const char*>(data), size);
  const Options options(TakeLine(&text));
  const std::string_view operations = TakeLine(&text);
  const bool buffered = !options.Has("direct");
  const int timeout = options.Has("blocking") ? -1 : 5;
  const std::vector<Connection> connections = ParseConnections(text);
  Wire wire(connections, options.Numbers());
  ModelSocket model(timeout, buffered, connections, options.Numbers());
  {
    Socket socket(timeout, buffered);
    Game game(&socket, &model);
    game.Play('C', 0);
    PlayAll(operations, &game);
  }
  CompareReads(wire, model);
  ExpectSame("open descriptors", wire.Open(), 0);
  return 0;
}
