#include "tests/support/log_capture.h"

#include <gtest/gtest.h>
#include <sys/shm.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <regex>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/files.h"

namespace {

constexpr int kCategories = 74;

// The head of a line, up to the message. The names are short; the message may be long, and is kept
// away from the expression.
const std::regex& LineHead() {
  static const std::regex head(
      R"(([A-Z][a-z]{2} [ \d]\d \d\d:\d\d:\d\d(?:\.\d{3})?|) \[(\d+)\](?:\[(\d+)\])?)"
      R"((?:\[([^\]\n]*)\]\[([^\]\n]*)\])? ([^:\n]*):(-?\d+):([^\n]*?)\(\): )",
      std::regex::optimize);
  return head;
}

bool ParseLine(const std::string& text, LogLine* line) {
  constexpr size_t kLongestHead = 512;
  const std::string start = text.substr(0, kLongestHead);
  std::smatch match;
  if (!std::regex_search(start, match, LineHead(), std::regex_constants::match_continuous)) {
    return false;
  }
  line->time = match[1];
  line->pid = std::stoi(match[2]);
  line->tid = match[3].matched ? std::stoi(match[3]) : 0;
  line->category = match[4];
  line->level = match[5];
  line->source = match[6];
  line->line = std::stoi(match[7]);
  line->function = match[8];
  line->message = text.substr(static_cast<size_t>(match[0].length()));
  return true;
}

}  // namespace

std::ostream& operator<<(std::ostream& out, const LogLine& line) {
  return out << "[" << line.category << "][" << line.level << "] " << line.source << ":"
             << line.line << ":" << line.function
             << "(): " << ::testing::PrintToString(line.message);
}

std::vector<LogLine> ParseLog(const std::string& text) {
  std::vector<LogLine> lines;
  for (size_t start = 0; start < text.size();) {
    const size_t found = text.find('\n', start);
    const size_t end = found == std::string::npos ? text.size() : found + 1;
    const std::string piece = text.substr(start, end - start);
    start = end;
    LogLine line;
    if (ParseLine(piece, &line)) {
      lines.push_back(line);
    } else if (!lines.empty()) {
      lines.back().message += piece;
    } else {
      ADD_FAILURE() << "not a log line: " << piece.substr(0, 200);
    }
  }
  return lines;
}

void RemoveSharedRecord() {
  const int id = shmget(kRecordKey, 0, 0);
  if (id != -1) shmctl(id, IPC_RMID, nullptr);
}

SharedRecord::SharedRecord(int level) {
  RemoveSharedRecord();
  id_ = shmget(kRecordKey, kRecordSize, IPC_CREAT | IPC_EXCL | 0666);
  void* address = shmat(id_, nullptr, 0);
  if (id_ == -1 || address == reinterpret_cast<void*>(-1)) {
    perror("no shared record");
    abort();  // nothing can be tested without it
  }
  bytes_ = static_cast<uint8_t*>(address);
  memset(bytes_, 0, kRecordSize);
  SetAllLevels(level);
}

SharedRecord::~SharedRecord() {
  shmdt(bytes_);
  shmctl(id_, IPC_RMID, nullptr);
}

void SharedRecord::SetLevel(int category, int level) {
  auto* levels = reinterpret_cast<int32_t*>(bytes_ + 4);
  __atomic_store_n(&levels[category], level, __ATOMIC_RELAXED);
}

void SharedRecord::SetAllLevels(int level) {
  for (int category = 0; category < kCategories; ++category) SetLevel(category, level);
}

int SharedRecord::Level(int category) const {
  const auto* levels = reinterpret_cast<const int32_t*>(bytes_ + 4);
  return __atomic_load_n(&levels[category], __ATOMIC_RELAXED);
}

void SharedRecord::SetTimeScale(bool milliseconds) {
  __atomic_store_n(&bytes_[0], static_cast<uint8_t>(milliseconds ? 1 : 0), __ATOMIC_RELAXED);
}

int SharedRecord::Attachments() const {
  struct shmid_ds status = {};
  EXPECT_EQ(shmctl(id_, IPC_STAT, &status), 0);
  return static_cast<int>(status.shm_nattch) - 1;
}

LogCapture::LogCapture(int level) : record_(level) {
  FreeDbgCfg();
  InitDbgCfg();
  if (g_pDbgLogCfg == nullptr) ADD_FAILURE() << "the library did not attach the record";
  Clear();
}

LogCapture::~LogCapture() {
  FreeDbgCfg();
}

std::vector<LogLine> LogCapture::Lines() const {
  return ParseLog(Text());
}

std::vector<LogLine> LogCapture::Lines(const std::string& category) const {
  std::vector<LogLine> lines = Lines();
  lines.erase(std::remove_if(lines.begin(), lines.end(),
                             [&](const LogLine& line) { return line.category != category; }),
              lines.end());
  return lines;
}

std::vector<std::string> LogCapture::Messages() const {
  std::vector<std::string> messages;
  for (LogLine& line : Lines()) messages.push_back(std::move(line.message));
  return messages;
}

std::string LogCapture::Text() const {
  return ReadFile(kMainLog);
}

void LogCapture::Clear() {
  unlink(kMainLog);
}
