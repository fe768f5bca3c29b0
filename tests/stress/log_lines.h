// The lines that the log cases write, and the check of what came of them.
#ifndef TARNWICK_TESTS_STRESS_LOG_LINES_H_
#define TARNWICK_TESTS_STRESS_LOG_LINES_H_

#include <sys/types.h>

#include <string>
#include <string_view>
#include <vector>

// The message of a writer's n-th line, with its line end. Its length, 20 to 60,000 bytes and mostly
// short, and its letters follow from the two numbers. It holds no capital letter, of which the
// beginning of a log line has one.
std::string MessageOf(int writer, int number);

// Writes it to the main log.
void WriteLine(int writer, int number);

// What a writer, a thread of some process, has done. Its lines are numbered from 0.
struct WriterFacts {
  pid_t pid = 0;

  // The lines whose writing was begun.
  int started = 0;

  // Of these, the lines from `lossy_from` to before `lossy_to` may be missing or cut: the writer
  // was killed in them, or the disk was full.
  int lossy_from = 0;
  int lossy_to = 0;
};

// Finds lines that are torn, doubled, lost or out of their writer's order.
class LogVerifier {
 public:
  explicit LogVerifier(std::vector<WriterFacts> writers);

  // Takes one log file apart; the files come in the order in which they were begun.
  void Read(std::string_view text);

  // Looks for what is missing. Call it once, after all files.
  void Finish();

  long WholeLines() const { return whole_; }
  long CutLines() const { return cut_; }
  long MissingLines() const { return missing_; }
  const std::vector<std::string>& Failures() const { return failures_; }

 private:
  enum Seen : char { kNot, kWhole, kCut };
  struct Piece;

  void ReadPiece(std::string_view text, bool last_of_line);
  void NoteWhole(const Piece& piece, std::string_view text);
  void NoteCut(const Piece& piece, std::string_view text);
  bool IsLossy(int writer, int number) const;
  void Fail(const std::string& what, std::string_view text);

  std::vector<WriterFacts> writers_;
  std::vector<std::vector<char>> seen_;
  std::vector<int> last_;  // each writer's last line in the file that is being read
  long whole_ = 0;
  long cut_ = 0;
  long cut_before_number_ = 0;
  long missing_ = 0;
  std::vector<std::string> failures_;
};

#endif  // TARNWICK_TESTS_STRESS_LOG_LINES_H_
