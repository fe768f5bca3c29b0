#include "tools/twlogctl/write_line.h"

#include <fcntl.h>
#include <json/value.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <iostream>
#include <sstream>
#include <thread>

#include "tarnwick/platform/unique.h"
#include "tools/common/json_output.h"
#include "tools/common/private_file.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/report.h"

namespace {

const char* PathOf(LOG_TYPE type) {
  return type == LOG_TYPE_NOTIFICATION ? kNotificationLogPath : kMainLogPath;
}

// The library waits for the lock for as long as it takes, and a script would seem to hang.
void TellWhenLocked(const char* path) {
  const tarnwick::UniqueFd fd(open(path, O_WRONLY | O_APPEND | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  if (!fd.Valid()) return;
  for (int tries = 0; tries < 20; ++tries) {
    if (flock(fd.Get(), LOCK_EX | LOCK_NB) == 0 || errno != EWOULDBLOCK) return;
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  Complain(std::string("waits for the lock of ") + path + "; \"twlogctl doctor\" tells who has it");
}

// The log's end before a line is written, so that the line can be looked for after it. The library
// does not say whether it has written one.
class LogEnd {
 public:
  explicit LogEnd(const char* path) : path_(path) { known_ = stat(path, &state_) == 0; }

  // A rotation in between leaves the line in the new file, or in the old one under another name.
  bool Has(const std::string& line) const {
    const tarnwick::UniqueFd fd = OpenRegularFile(path_);
    struct stat now = {};
    if (!fd.Valid() || fstat(fd.Get(), &now) != 0) return false;
    const bool same_file = known_ && now.st_ino == state_.st_ino && now.st_dev == state_.st_dev;
    const off_t start = same_file && now.st_size >= state_.st_size ? state_.st_size : 0;
    return ReadFrom(fd.Get(), start).find(line) != std::string::npos;
  }

 private:
  static std::string ReadFrom(int fd, off_t start) {
    std::string text;
    char piece[65536];
    ssize_t count = 0;
    while ((count = pread(fd, piece, sizeof(piece), start)) > 0) {
      text.append(piece, static_cast<size_t>(count));
      start += count;
    }
    return text;
  }

  const char* path_;
  struct stat state_ = {};
  bool known_ = false;
};

// Results: false when the line is not in the log afterwards.
bool WriteOne(const WriteOptions& options, const std::string& text) {
  const char* const path = PathOf(options.type);
  const LogEnd end(path);
  const char* const categ = Enum2String(options.categ);
  const char* const level = Enum2String(options.level);
  TWPrintf(options.type, categ, level, options.source.c_str(), 0, "write", "%s\n", text.c_str());
  const std::string tail = "[" + std::to_string(getpid()) + "][" + categ + "][" + level + "] " +
                           GetFileBaseName(options.source) + ":0:write(): " + text.c_str() + "\n";
  if (end.Has(tail)) return true;
  // A file that may be written and not be read tells nothing, and that is no failure.
  if (access(path, R_OK) != 0 && errno == EACCES && access(path, W_OK) == 0) return true;
  Complain(std::string("the line is not in ") + path + "; \"twlogctl doctor\" tells why");
  return false;
}

// A line feed inside a line would let a script's data look like lines of other programs.
bool WriteLines(const WriteOptions& options, std::istream& lines, unsigned* written) {
  for (std::string line; std::getline(lines, line);) {
    if (!WriteOne(options, line)) return false;
    ++*written;
  }
  return true;
}

bool IsOff(const WriteOptions& options) {
  return !options.force && !TWLogEnabled(options.categ, options.level);
}

int TellOff(const WriteOptions& options) {
  const int level = g_pDbgLogCfg != nullptr ? g_pDbgLogCfg->Level(options.categ) : LOG_LEVEL_NOTICE;
  Complain(std::string("not written: ") + Enum2String(options.categ) + " is at " +
           LevelText(level) + (g_pDbgLogCfg != nullptr ? "" : " (there is no record)") +
           ", which leaves " + Enum2String(options.level) + " out; --force writes it");
  return kExitWrong;
}

}  // namespace

int WriteText(const WriteOptions& options) {
  if (IsOff(options)) return TellOff(options);
  TellWhenLocked(PathOf(options.type));
  // An empty text is a line as well.
  std::istringstream text(options.text.empty() ? "\n" : options.text);
  unsigned written = 0;
  const bool from_input = options.text == "-";
  const bool done = WriteLines(options, from_input ? std::cin : text, &written);
  if (options.json) {
    Json::Value line;
    line["written"] = written;
    line["log"] = PathOf(options.type);
    PrintJsonLine(line);
  }
  return done ? kExitDone : kExitWrong;
}
