// Reads what the library logged.
//
//   LogCapture log;  // every category at debug3
//   TWSocket socket("127.0.0.1", port, -1, true);
//   socket.Connect();
//   EXPECT_THAT(log.Lines(), ElementsAre(IsLog("socket", "info", "twsocket", "ConnectSocket",
//                                              "Socket connect failed.\n")));
#ifndef TARNWICK_TESTS_SUPPORT_LOG_CAPTURE_H_
#define TARNWICK_TESTS_SUPPORT_LOG_CAPTURE_H_

#include <gmock/gmock.h>

#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

inline constexpr char kMainLog[] = "/var/log/tarnwick/tarnwick.log";
inline constexpr char kNotificationLog[] = "/var/log/tarnwick/twnotification.log";
inline constexpr key_t kRecordKey = 0x18180004;
inline constexpr int kRecordSize = 300;

// One log line, taken apart.
struct LogLine {
  std::string time;  // "Mar  5 14:03:09", with ".417" after it when it carries milliseconds
  int pid = 0;
  int tid = 0;           // 0: the main thread
  std::string category;  // empty when the line has no tags
  std::string level;     // empty when the line has no tags
  std::string source;
  int line = 0;
  std::string function;
  std::string message;  // with its line end; further lines of the message included
};

std::ostream& operator<<(std::ostream& out, const LogLine& line);

// Takes the text of a log file apart. A line that does not start as a log line belongs to the
// message before it; when there is none, the test fails.
std::vector<LogLine> ParseLog(const std::string& text);

MATCHER_P5(IsLog, category, level, source, function, message, "") {
  return arg.category == category && arg.level == level && arg.source == source &&
         arg.function == function && arg.message == message;
}

// The shared record of levels, created as the product's managing process does it and removed at the
// end. It is not attached by the library: InitDbgCfg does that.
class SharedRecord {
 public:
  // Creates the segment with the flag off and every level at `level`. A segment that is left over
  // is removed first.
  explicit SharedRecord(int level = 3);
  ~SharedRecord();
  SharedRecord(const SharedRecord&) = delete;
  SharedRecord& operator=(const SharedRecord&) = delete;

  void SetLevel(int category, int level);
  void SetAllLevels(int level);
  int Level(int category) const;
  void SetTimeScale(bool milliseconds);

  // The processes that have it attached, this object's own attachment not counted.
  int Attachments() const;

  // The 300 bytes of the record.
  uint8_t* Bytes() { return bytes_; }

 private:
  int id_ = -1;
  uint8_t* bytes_ = nullptr;
};

// Removes the segment of the record, if there is one.
void RemoveSharedRecord();

// A shared record, attached by the library, and an empty main log. Destruction detaches the library
// and removes the record. REQUIRES: one at a time.
class LogCapture {
 public:
  explicit LogCapture(int level = 7);
  ~LogCapture();
  LogCapture(const LogCapture&) = delete;
  LogCapture& operator=(const LogCapture&) = delete;

  SharedRecord& Record() { return record_; }
  void SetLevel(int category, int level) { record_.SetLevel(category, level); }

  // The lines written since construction or Clear; those of one category.
  std::vector<LogLine> Lines() const;
  std::vector<LogLine> Lines(const std::string& category) const;

  // Their messages alone.
  std::vector<std::string> Messages() const;

  // The main log as it stands.
  std::string Text() const;

  void Clear();

 private:
  SharedRecord record_;
};

#endif  // TARNWICK_TESTS_SUPPORT_LOG_CAPTURE_H_
