#include "tools/twlogctl/log_tail.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <utility>

#include "tools/common/private_file.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::minutes;
using std::chrono::seconds;

// The lines of a message come at once, or nearly so when it is longer than the writer's buffer.
constexpr milliseconds kMessageEnd(100);

// Looks without an event, for what has none.
constexpr seconds kLook(1);

constexpr minutes kQuiet(1);

// Files that are read on. Rotations come hours apart.
constexpr size_t kMostSources = 16;

std::string DirectoryOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) return ".";
  return slash == 0 ? "/" : path.substr(0, slash);
}

}  // namespace

LogTail::LogTail(std::string path) : path_(std::move(path)) {
  WatchDirectory();
}

void LogTail::WatchDirectory() {
  watch_.AddDirectory(DirectoryOf(path_));
  directory_watched_ = Clock::now();
}

LogTail::SourceIterator LogTail::Known(const struct stat& status) {
  return std::find_if(sources_.begin(), sources_.end(),
                      [&](const Source& source) { return source.file.Is(status); });
}

// Makes the file at the path the last source. One that comes back under its old name is read on
// where it was left. Results: 0 or an errno.
int LogTail::OpenFile() {
  tarnwick::UniqueFd fd = OpenRegularFile(path_.c_str());
  struct stat status = {};
  if (!fd.Valid() || fstat(fd.Get(), &status) != 0) return errno;
  const SourceIterator known = Known(status);
  if (known != sources_.end()) {
    sources_.splice(sources_.end(), sources_, known);
    return 0;
  }
  const int watch = watch_.AddFile(fd.Get());
  sources_.push_back({LogFile(std::move(fd)), MessageSplitter(), watch, Clock::now()});
  return 0;
}

void LogTail::FindFile() {
  struct stat status = {};
  if (stat(path_.c_str(), &status) != 0) {
    error_ = errno;
  } else if (sources_.empty() || !sources_.back().file.Is(status)) {
    error_ = OpenFile();
  } else {
    error_ = 0;
  }
}

// Results: whether something new came.
bool LogTail::ReadSource(Source* source, const MessageSink& sink) {
  std::string data;
  bool changed = false;
  // No more than there is now: a file that grows as fast as it is read must not keep the others
  // waiting.
  for (off_t unread = source->file.Unread(); unread >= 0;) {
    const LogFile::Result result = source->file.Read(&data);
    if (result == LogFile::Result::kNothing) break;
    changed = true;
    if (result == LogFile::Result::kRestarted) {
      source->splitter.End(sink);  // the rest of an incomplete line is gone
      unread = source->file.Unread();
    } else {
      source->splitter.Feed(data, sink);
      unread -= static_cast<off_t>(data.size());
    }
  }
  return changed;
}

void LogTail::ReadAll(const MessageSink& sink) {
  for (Source& source : sources_) {
    const Clock::time_point now = Clock::now();
    if (ReadSource(&source, sink)) {
      source.changed = now;
    } else if (now - source.changed >= kMessageEnd) {
      source.splitter.Flush(sink);
    }
  }
}

void LogTail::DropOver(const MessageSink& sink) {
  const Clock::time_point now = Clock::now();
  for (auto source = sources_.begin(); source != sources_.end();) {
    const bool at_path = error_ == 0 && std::next(source) == sources_.end();
    const bool over = source->file.Removed() && now - source->changed >= kQuiet;
    if (at_path || (!over && sources_.size() <= kMostSources)) {
      ++source;
      continue;
    }
    source->splitter.End(sink);
    watch_.Remove(source->watch);
    source = sources_.erase(source);
  }
}

void LogTail::Poll(const MessageSink& sink) {
  watch_.Drain();
  if (Clock::now() - directory_watched_ >= kLook) WatchDirectory();
  // What was written before the rotation comes before what was written after it.
  ReadAll(sink);
  FindFile();
  ReadAll(sink);
  DropOver(sink);
}

void LogTail::Flush(const MessageSink& sink) {
  for (Source& source : sources_) source.splitter.Flush(sink);
}

milliseconds LogTail::Patience() const {
  const bool waits = std::any_of(sources_.begin(), sources_.end(),
                                 [](const Source& source) { return source.splitter.Waits(); });
  return waits ? kMessageEnd : milliseconds(kLook);
}
