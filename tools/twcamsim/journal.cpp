#include "tools/twcamsim/journal.h"

#include <fcntl.h>
#include <sys/time.h>

#include <cerrno>
#include <cstring>
#include <ctime>

#include "tools/common/private_file.h"

Journal::~Journal() {
  if (file_ && file_ != stdout) std::fclose(file_);
}

bool Journal::Open(const std::string& path, std::string* error) {
  if (path.empty()) return true;
  if (path == "-") {
    file_ = stdout;
    return true;
  }
  tarnwick::UniqueFd fd = OpenOwnFile(path, O_WRONLY | O_APPEND, 0600, error);
  if (!fd.Valid()) return false;
  file_ = fdopen(fd.Get(), "a");
  if (!file_) {
    *error = path + ": " + std::strerror(errno);
    return false;
  }
  fd.Release();
  return true;
}

void Journal::Write(const std::string& line) {
  const std::lock_guard<std::mutex> lock(mutex_);
  if (!file_) return;
  std::fwrite(line.data(), 1, line.size(), file_);
  std::fputc('\n', file_);
  std::fflush(file_);
}

std::string TimeText() {
  timeval now = {};
  gettimeofday(&now, nullptr);
  tm parts = {};
  gmtime_r(&now.tv_sec, &parts);
  char text[32], all[48];
  strftime(text, sizeof(text), "%Y-%m-%dT%H:%M:%S", &parts);
  snprintf(all, sizeof(all), "%s.%03dZ", text, static_cast<int>(now.tv_usec / 1000));
  return all;
}

std::string Excerpt(const std::string& text) {
  constexpr size_t kMost = 65536;
  if (text.size() <= kMost) return text;
  return text.substr(0, kMost) + "... (" + std::to_string(text.size()) + " bytes)";
}
