// Follows a log by its path through renames, removals and truncations.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_TAIL_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_TAIL_H_

#include <chrono>
#include <list>
#include <string>

#include "tools/twlogctl/log_file.h"
#include "tools/twlogctl/log_messages.h"
#include "tools/twlogctl/log_watch.h"

// A writer opens the file and then waits for its lock, so lines reach a file after it was renamed
// or removed. Each file that was at the path is read on: until it has been quiet for a minute when
// it was removed, and as one of the last when it was renamed, because it may come back.
class LogTail {
 public:
  using Clock = std::chrono::steady_clock;

  explicit LogTail(std::string path);

  // Hands out the messages that are new, those of older files first. The last message of a file
  // waits a little for further lines, and an incomplete line for its end.
  void Poll(const MessageSink& sink);

  // Hands out what waits for further lines.
  void Flush(const MessageSink& sink);

  // How long to wait at most, unless Descriptor() becomes readable, before the next Poll.
  std::chrono::milliseconds Patience() const;
  int Descriptor() const { return watch_.Descriptor(); }

  // 0 while the path leads to a log that can be read, else the errno of opening it.
  int Error() const { return error_; }

 private:
  struct Source {
    LogFile file;
    MessageSplitter splitter;
    int watch;
    Clock::time_point changed;
  };

  using SourceIterator = std::list<Source>::iterator;
  SourceIterator Known(const struct stat& status);
  void FindFile();
  int OpenFile();
  void WatchDirectory();
  bool ReadSource(Source* source, const MessageSink& sink);
  void ReadAll(const MessageSink& sink);
  void DropOver(const MessageSink& sink);

  std::string path_;
  LogWatch watch_;
  std::list<Source> sources_;  // the last one is that at the path, if error_ is 0
  Clock::time_point directory_watched_;
  int error_ = 0;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_TAIL_H_
