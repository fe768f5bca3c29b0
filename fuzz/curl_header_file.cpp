// The response file: a head, line by line, and the body after it. Line 1: "items" and a number
// deliver items of that many bytes, "room" and a number end the file's space, "unbuffered" writes
// through; further numbers are the sizes of the body's pieces. The rest is what the server sends.
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/oracle/curl_header_file.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/platform/unique.h"

using namespace tarnwick;

namespace {

// A file in memory whose space ends after `room` bytes.
class BoundedFile {
 public:
  BoundedFile(size_t room, bool buffered) : room_(room) {
    cookie_io_functions_t calls = {};
    calls.write = Write;
    file_.reset(fopencookie(this, "w", calls));
    Expect("a file in memory opens", file_ != nullptr);
    if (!buffered) std::setvbuf(file_.get(), nullptr, _IONBF, 0);
  }

  FILE* Get() const { return file_.get(); }
  const std::string& Bytes() const { return bytes_; }

 private:
  static ssize_t Write(void* self, const char* bytes, size_t count) {
    auto* file = static_cast<BoundedFile*>(self);
    const size_t taken = std::min(count, file->room_ - file->bytes_.size());
    file->bytes_.append(bytes, taken);
    return static_cast<ssize_t>(taken);
  }

  const size_t room_;
  std::string bytes_;
  UniqueFile file_;
};

constexpr size_t kEnoughRoom = 1 << 20;

struct Settings {
  size_t item = 1;
  size_t room = kEnoughRoom;
  bool buffered = true;
  std::vector<size_t> pieces;
};

Settings SettingsOf(std::string_view line) {
  const Options options(line);
  Settings settings;
  settings.pieces = options.Numbers();
  settings.buffered = !options.Has("unbuffered");
  for (const auto& [word, number] :
       {std::pair("items", &settings.item), {"room", &settings.room}}) {
    if (!options.Has(word) || settings.pieces.empty()) continue;
    *number = settings.pieces[0];
    settings.pieces.erase(settings.pieces.begin());
  }
  if (settings.pieces.empty()) settings.pieces.push_back(16384);
  return settings;
}

// Takes up to and including the next line feed, as libcurl delivers a head.
std::string TakeHeaderLine(std::string_view* text) {
  const size_t end = std::min(text->find('\n'), text->size() - 1) + 1;
  std::string line(text->substr(0, end));
  text->remove_prefix(end);
  return line;
}

class Transfer {
 public:
  explicit Transfer(const Settings& settings)
      : settings_(settings),
        library_(settings.room, settings.buffered),
        oracle_(settings.room, settings.buffered) {}

  void HeaderLine(std::string line) {
    const size_t count = line.size() / settings_.item;
    line.resize(count * settings_.item);
    const size_t taken = Call(CurlHeaderToFile, line, settings_.item, count, library_.Get());
    ExpectSame(
        "what a header line returns", static_cast<int64_t>(taken),
        static_cast<int64_t>(oracle::WriteHeaderLine(line, settings_.item, count, oracle_.Get())));
    ExpectSame("the file after a header line", library_.Bytes(), oracle_.Bytes());
    if (oracle::GoesIntoFile(line)) expected_ += line;
  }

  void Body(std::string_view body) {
    for (size_t n = 0; !body.empty(); ++n) {
      const std::string piece(body.substr(0, settings_.pieces[n % settings_.pieces.size()]));
      body.remove_prefix(piece.size());
      BodyPiece(piece);
    }
  }

  void Finish() {
    const bool same = std::fflush(library_.Get()) == std::fflush(oracle_.Get());
    Expect("both files flush or fail", same);
    ExpectSame("the file", library_.Bytes(), oracle_.Bytes());
    if (settings_.room == kEnoughRoom) ExpectSame("the message", library_.Bytes(), expected_);
  }

 private:
  using Callback = size_t (*)(char*, size_t, size_t, void*);

  // From memory that ends where the data does, so that the sanitizer sees a read beyond it.
  static size_t Call(Callback callback, const std::string& text, size_t size, size_t count,
                     void* target) {
    const std::unique_ptr<char[]> bytes(new char[text.size()]);
    std::copy(text.begin(), text.end(), bytes.get());
    return callback(bytes.get(), size, count, target);
  }

  void BodyPiece(const std::string& piece) {
    const size_t n = piece.size();
    const size_t taken = Call(CurlFileWrite, piece, 1, n, library_.Get());
    ExpectSame("what a piece of the body returns", static_cast<int64_t>(taken),
               static_cast<int64_t>(std::fwrite(piece.data(), 1, n, oracle_.Get())));
    expected_ += piece;
    std::string text = "kept";
    Expect("a string takes all", Call(CurlStringWrite, piece, 1, n, &text) == n);
    ExpectSame("the string", text, "kept" + piece);
    Expect("dropping takes all", Call(CurlDiscardWrite, piece, 1, n, nullptr) == n);
  }

  const Settings settings_;
  BoundedFile library_;
  BoundedFile oracle_;
  std::string expected_;
};

// Reads the message back in pieces, as an upload does.
void CheckReading(const std::string& message, const Settings& settings) {
  if (message.empty()) return;
  std::string copy = message;
  const UniqueFile file(fmemopen(copy.data(), copy.size(), "r"));
  Expect("the message opens", file != nullptr);
  std::string read;
  for (size_t n = 0;; ++n) {
    const size_t size = settings.pieces[n % settings.pieces.size()];
    const std::unique_ptr<char[]> piece(new char[size]);
    const size_t count = CurlFileRead(piece.get(), 1, size, file.get());
    ExpectSame("what a read returns", static_cast<int64_t>(count),
               static_cast<int64_t>(std::min(size, message.size() - read.size())));
    if (count == 0) break;
    read.append(piece.get(), count);
  }
  ExpectSame("what was read", read, message);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view input(reinterpret_cast<const char*>(data), size);
  const Settings settings = SettingsOf(TakeLine(&input));
  CheckReading(std::string(input), settings);
  Transfer transfer(settings);
  while (!input.empty()) {
    const std::string line = TakeHeaderLine(&input);
    transfer.HeaderLine(line);
    if (line == "\r\n") break;
  }
  transfer.Body(input);
  transfer.Finish();
  return 0;
}
