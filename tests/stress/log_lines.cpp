#include "tests/stress/log_lines.h"

#include <algorithm>
#include <cstdint>

#include "tarnwick/log/twdebuglog.h"

namespace {

constexpr size_t kShortest = 20;
constexpr size_t kLongest = 60000;
constexpr size_t kOffsets = 4096;

uint32_t Mix(uint32_t value) {
  value = (value ^ (value >> 16)) * 0x45d9f3bu;
  value = (value ^ (value >> 16)) * 0x45d9f3bu;
  return value ^ (value >> 16);
}

// Letters of which each message takes a part.
std::string MakeLetters() {
  std::string letters;
  for (uint32_t i = 0; i < kLongest + kOffsets; ++i) {
    letters.push_back(static_cast<char>('a' + Mix(i) % 26));
  }
  return letters;
}

uint32_t HashOf(int writer, int number) {
  return Mix(static_cast<uint32_t>(writer) * 100003u + static_cast<uint32_t>(number));
}

// The two ends of the range come regularly; of the rest, one in twenty is long.
size_t LengthOf(int writer, int number) {
  if (number % 50 == 0) return kShortest;
  if (number % 50 == 1) return kLongest;
  const uint32_t hash = HashOf(writer, number);
  const size_t most = hash % 20 == 0 ? kLongest : hash % 20 < 5 ? 8000 : 500;
  return kShortest + (hash >> 8) % (most - kShortest);
}

// Reads a text from its front. Once something does not fit, or the text ends, nothing fits any
// more.
class Cursor {
 public:
  explicit Cursor(std::string_view text) : text_(text) {}

  bool Literal(std::string_view expected) {
    const size_t common = std::min(expected.size(), text_.size());
    if (!good_ || text_.substr(0, common) != expected.substr(0, common)) return Stop(false);
    text_.remove_prefix(common);
    return common == expected.size() || Stop(true);
  }

  // A number, which ends before the next character that is no digit.
  bool Number(int* value) {
    const size_t digits = std::min(text_.find_first_not_of("0123456789"), text_.size());
    if (!good_ || digits > 9) return Stop(false);
    if (digits == text_.size()) return Stop(true);
    if (digits == 0) return Stop(false);
    *value = std::stoi(std::string(text_.substr(0, digits)));
    text_.remove_prefix(digits);
    return true;
  }

  // Characters by their kind: 'A' a capital, 'a' a small letter, '0' a digit or a blank.
  bool Shape(std::string_view shape) {
    for (const char kind : shape) {
      if (!good_) return false;
      if (text_.empty()) return Stop(true);
      if (!IsKind(text_.front(), kind)) return Stop(false);
      text_.remove_prefix(1);
    }
    return good_;
  }

  bool NextIs(char ch) const { return good_ && !text_.empty() && text_.front() == ch; }
  std::string_view Rest() const { return text_; }

  // True when all that there was did fit.
  bool Ended() const { return ended_ || (good_ && text_.empty()); }

 private:
  static bool IsKind(char ch, char kind) {
    if (kind == 'A') return ch >= 'A' && ch <= 'Z';
    if (kind == 'a') return ch >= 'a' && ch <= 'z';
    if (kind == '0') return (ch >= '0' && ch <= '9') || ch == ' ';
    return ch == kind;
  }

  bool Stop(bool ended) {
    ended_ = good_ && ended;
    good_ = false;
    return false;
  }

  std::string_view text_;
  bool good_ = true;
  bool ended_ = false;
};

}  // namespace

// What could be read of one piece, which is a whole line or the beginning of one.
struct LogVerifier::Piece {
  int pid = -1;
  int writer = -1;
  int number = -1;
  bool whole = false;
  bool begins_a_line = false;  // all that there is fits
};

namespace {

// Reads up to the message; false when it ends before or does not fit.
bool ReadPrefix(Cursor& cursor, int* pid, int* line) {
  int thread = 0;
  if (!cursor.Shape("Aaa 00 00:00:00") || !cursor.Literal(" [") || !cursor.Number(pid))
    return false;
  if (!cursor.Literal("][")) return false;
  const bool other_thread = !cursor.NextIs('h');
  if (other_thread && (!cursor.Number(&thread) || !cursor.Literal("]["))) return false;
  return cursor.Literal("http][warn] stress:") && cursor.Number(line) &&
         cursor.Literal(":write(): ");
}

// Reads the numbers at the front of the message without taking them.
bool ReadNumbers(Cursor cursor, int* writer, int* number, bool* ended) {
  int found_writer = 0;
  const bool read = cursor.Literal("w") && cursor.Number(&found_writer) && cursor.Literal(" n") &&
                    cursor.Number(number);
  *ended = cursor.Ended();
  if (read) *writer = found_writer;
  return read;
}

}  // namespace

std::string MessageOf(int writer, int number) {
  static const std::string letters = MakeLetters();
  const size_t length = LengthOf(writer, number);
  std::string text = "w" + std::to_string(writer) + " n" + std::to_string(number) + " ";
  const size_t filled = std::min(text.size(), length - 1);
  text.append(letters, HashOf(writer, number) % kOffsets, length - 1 - filled);
  return text + "\n";
}

void WriteLine(int writer, int number) {
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "stress", number, "write", "%s",
           MessageOf(writer, number).c_str());
}

LogVerifier::LogVerifier(std::vector<WriterFacts> writers)
    : writers_(std::move(writers)), seen_(writers_.size()) {
  for (size_t i = 0; i < writers_.size(); ++i) {
    seen_[i].resize(static_cast<size_t>(writers_[i].started), kNot);
  }
}

void LogVerifier::Read(std::string_view text) {
  last_.assign(writers_.size(), -1);
  while (!text.empty()) {
    const size_t feed = text.find('\n');
    const size_t end = feed == std::string_view::npos ? text.size() : feed + 1;
    std::string_view line = text.substr(0, end);
    text.remove_prefix(end);
    // A cut line has no line feed, so the next one, with the capital of its month, follows in the
    // same line.
    while (!line.empty()) {
      const size_t next = line.find_first_of("ABCDEFGHIJKLMNOPQRSTUVWXYZ", 1);
      ReadPiece(line.substr(0, next), next == std::string_view::npos);
      line.remove_prefix(std::min(next, line.size()));
    }
  }
}

void LogVerifier::ReadPiece(std::string_view text, bool last_of_line) {
  Piece piece;
  int line = -1;
  Cursor cursor(text);
  const bool prefix = ReadPrefix(cursor, &piece.pid, &line);
  piece.begins_a_line = cursor.Ended();
  if (prefix && ReadNumbers(cursor, &piece.writer, &piece.number, &piece.begins_a_line)) {
    const std::string message = MessageOf(piece.writer, piece.number);
    piece.whole = cursor.Rest() == message && line == piece.number;
    piece.begins_a_line =
        std::string_view(message).substr(0, cursor.Rest().size()) == cursor.Rest();
  }
  if (piece.whole && last_of_line) {
    NoteWhole(piece, text);
  } else if (piece.begins_a_line) {
    NoteCut(piece, text);
  } else {
    Fail("torn", text);
  }
}

void LogVerifier::NoteWhole(const Piece& piece, std::string_view text) {
  const auto writer = static_cast<size_t>(piece.writer);
  const auto number = static_cast<size_t>(piece.number);
  if (writer >= writers_.size() || number >= seen_[writer].size()) return Fail("unknown", text);
  if (piece.pid != writers_[writer].pid) Fail("from another process", text);
  if (seen_[writer][number] != kNot) Fail("doubled", text);
  if (piece.number < last_[writer]) Fail("out of order", text);
  last_[writer] = piece.number;
  seen_[writer][number] = kWhole;
  ++whole_;
}

void LogVerifier::NoteCut(const Piece& piece, std::string_view text) {
  ++cut_;
  if (piece.writer < 0) {
    ++cut_before_number_;
    return;
  }
  if (!IsLossy(piece.writer, piece.number)) return Fail("cut", text);
  char& seen = seen_[static_cast<size_t>(piece.writer)][static_cast<size_t>(piece.number)];
  if (seen != kNot) Fail("doubled, one of them cut", text);
  seen = kCut;
}

bool LogVerifier::IsLossy(int writer, int number) const {
  const auto i = static_cast<size_t>(writer);
  return i < writers_.size() && number < writers_[i].started && number >= writers_[i].lossy_from &&
         number < writers_[i].lossy_to;
}

void LogVerifier::Finish() {
  for (size_t i = 0; i < writers_.size(); ++i) {
    for (int number = 0; number < writers_[i].started; ++number) {
      if (seen_[i][static_cast<size_t>(number)] != kNot) continue;
      ++missing_;
      if (IsLossy(static_cast<int>(i), number)) continue;
      Fail("lost", "w" + std::to_string(i) + " n" + std::to_string(number));
    }
  }
  // Lines that were cut before their number are taken for missing as well.
  if (cut_before_number_ > missing_) Fail("more cut lines than missing ones", "");
}

void LogVerifier::Fail(const std::string& what, std::string_view text) {
  std::string shown(text.substr(0, 100));
  if (text.size() > 100) shown += "... (" + std::to_string(text.size()) + " bytes)";
  failures_.push_back(what + ": " + shown);
}
