// A response's head and framing, followed byte by byte as it arrives.
//
// It stands beside the library's own reading, which believes devices in much: what was announced
// and what came are compared here.
#ifndef TARNWICK_TOOLS_TWHTTP_MESSAGE_H_
#define TARNWICK_TOOLS_TWHTTP_MESSAGE_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

using HeaderLines = std::vector<std::pair<std::string, std::string>>;

// How the end of a response's body is told.
enum class Framing { kUnknown, kNone, kLength, kChunked, kUntilClose };

class ResponseMessage {
 public:
  // The next bytes that came. Any split has the same result.
  void Feed(std::string_view bytes);

  bool HeadComplete() const { return state_ != State::kHead; }

  // The announced body has come in full. For kUntilClose never: only the close tells.
  bool BodyComplete() const { return state_ == State::kDone; }

  int Status() const { return status_; }
  int Interims() const { return interims_; }  // responses of 100 to 199 in front of it
  Framing BodyFraming() const { return framing_; }

  // The head as it came, of at most 256 KiB, with its line ends.
  const std::string& Head() const { return head_; }

  // Names and values without the blanks around them; a line without a colon has no name.
  const HeaderLines& Headers() const { return headers_; }

  // The value of the last line of that name (any case), or an empty text.
  std::string Value(std::string_view name) const;

  uint64_t HeadBytes() const { return head_bytes_; }
  uint64_t BodyBytes() const { return body_bytes_; }  // chunk lines included
  uint64_t Announced() const { return announced_; }   // of kLength
  uint64_t Surplus() const { return surplus_; }       // bytes after the end of the body

  // A chunk is not what it should be; the library then takes the body for ended.
  bool BadChunk() const { return bad_chunk_; }

  // What of the body is missing, in words; empty when nothing is.
  std::string Missing() const;

 private:
  enum class State { kHead, kBody, kDone };
  enum class ChunkState { kSize, kData, kDataEnd, kTrailer };

  size_t FeedHead(std::string_view bytes);
  void EndLine();
  void EndHead();
  size_t FeedBody(std::string_view bytes);
  size_t FeedChunked(std::string_view bytes);
  void EndChunkLine();

  State state_ = State::kHead;
  std::string head_;
  std::string line_;
  HeaderLines headers_;
  bool first_line_ = true;
  int status_ = 0;
  int interims_ = 0;
  Framing framing_ = Framing::kUnknown;
  uint64_t head_bytes_ = 0;
  uint64_t body_bytes_ = 0;
  uint64_t announced_ = 0;
  uint64_t surplus_ = 0;
  ChunkState chunk_state_ = ChunkState::kSize;
  uint64_t chunk_left_ = 0;
  bool bad_chunk_ = false;
};

// One thing about a response's head that the library, or a strict client, trips over.
struct HeadFinding {
  std::string text;     // what was seen
  std::string rule;     // what the library makes of it
  bool breaks = false;  // the library then reads another head or body than was meant
};

std::vector<HeadFinding> InspectHead(const ResponseMessage& response);

// The header lines of a request's or response's head, without its first line.
HeaderLines SplitHeaderLines(std::string_view head);

#endif  // TARNWICK_TOOLS_TWHTTP_MESSAGE_H_
