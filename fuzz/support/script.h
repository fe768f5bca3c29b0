// A fuzzed input as text: one line of options, then what the peer sends, with marks for what
// happens on the way. A corpus file therefore reads like the exchange that it is:
//
//   get buffered 1 64
//   HTTP/1.1 200 OK
//   Transfer-Encoding: chunked
//
//   4
//   Wi<<wait>>ki
//   0<<close>>
#ifndef TARNWICK_FUZZ_SUPPORT_SCRIPT_H_
#define TARNWICK_FUZZ_SUPPORT_SCRIPT_H_

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

// What a reader meets after some bytes.
enum class Event {
  kNone,
  kWait,     // a wait that times out, and a read without anything to read
  kIntr,     // a read that a signal interrupts
  kSignal,   // a wait that a signal interrupts
  kStrange,  // a wait that ends without anything being ready
  kBroken,   // a wait that fails, or a read that does
  kReset,    // the end: the connection is reset
  kStall,    // the end: nothing comes any more
  kClose,    // the end
};

struct Piece {
  std::string bytes;
  Event event;
};

// How a connection comes about.
enum class Dial { kAtOnce, kLate, kRefused, kLost, kSilent };

// How it takes what is written.
enum class Intake { kWhole, kHalves, kNothing, kFullOnce, kBrokenPipe };

struct Connection {
  Dial dial = Dial::kAtOnce;
  Intake intake = Intake::kWhole;
  std::vector<Piece> pieces;  // the last one ends with kReset, kStall or kClose
};

// The words of an options line, and its numbers.
class Options {
 public:
  explicit Options(std::string_view line);

  bool Has(std::string_view word) const;

  // The numbers from 1 to 70,000, 16 at most; for read sizes.
  const std::vector<size_t>& Numbers() const { return numbers_; }

 private:
  std::string line_;
  std::vector<size_t> numbers_;
};

// Takes the first line off `text`, without its line feed.
std::string_view TakeLine(std::string_view* text);

// The connections that `text` describes; at least one. Each mark that ends one begins the next.
std::vector<Connection> ParseConnections(std::string_view text);

#endif  // TARNWICK_FUZZ_SUPPORT_SCRIPT_H_
