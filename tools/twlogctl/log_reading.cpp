#include "tools/twlogctl/log_reading.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <vector>

#include "tarnwick/platform/unique.h"
#include "tools/common/private_file.h"
#include "tools/twlogctl/log_messages.h"
#include "tools/twlogctl/log_paths.h"

namespace {

constexpr size_t kPiece = size_t{64} * 1024;

Moment NewestLineOf(int fd) {
  struct stat status = {};
  if (fstat(fd, &status) != 0 || !S_ISREG(status.st_mode)) return Now();
  return std::min(Now(), Moment(std::chrono::seconds(status.st_mtim.tv_sec + 1)));
}

// A file that somebody names may be a pipe, and is waited for. At a path of the library there is a
// regular file, or nothing is read: a FIFO would hold the reader, and a device may have no end.
// Results: not Valid() with errno.
tarnwick::UniqueFd OpenLog(const std::string& path) {
  if (path == "-") return tarnwick::UniqueFd(dup(STDIN_FILENO));
  if (!IsOwnLog(path)) return tarnwick::UniqueFd(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  return OpenRegularFile(path.c_str());
}

int ReadMessages(int fd, const MessageSink& sink) {
  std::vector<char> piece(kPiece);
  MessageSplitter splitter;
  ssize_t got = read(fd, piece.data(), piece.size());
  for (; got > 0; got = read(fd, piece.data(), piece.size())) {
    splitter.Feed({piece.data(), static_cast<size_t>(got)}, sink);
  }
  const int error = got < 0 ? errno : 0;
  splitter.End(sink);
  return error;
}

}  // namespace

int ReadLog(const std::string& path, const LogFilter& filter, const WantedSink& sink) {
  const tarnwick::UniqueFd file = OpenLog(path);
  if (!file.Valid()) return errno;
  LogSelector selector(filter, NewestLineOf(file.Get()), IsOwnLog(path));
  return ReadMessages(file.Get(), [&](std::string_view text, bool continues) {
    selector.Take(text, continues, sink);
  });
}
