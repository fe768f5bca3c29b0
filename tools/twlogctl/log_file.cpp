#include "tools/twlogctl/log_file.h"

#include <unistd.h>

#include <algorithm>

namespace {

constexpr size_t kPiece = size_t{64} * 1024;

// Long enough to hold the time and the text of a line that nobody writes twice.
constexpr size_t kMarkSize = 256;

std::string ReadAt(int fd, off_t offset, size_t size) {
  std::string bytes(size, '\0');
  const ssize_t got = pread(fd, bytes.data(), size, offset);
  bytes.resize(got > 0 ? static_cast<size_t>(got) : 0);
  return bytes;
}

}  // namespace

bool LogFile::Stands(const Mark& mark) const {
  return mark.bytes.empty() || ReadAt(fd_.Get(), mark.offset, mark.bytes.size()) == mark.bytes;
}

bool LogFile::Truncated() const {
  struct stat status = {};
  if (fstat(fd_.Get(), &status) == 0 && status.st_size < offset_) return true;
  return !Stands(tail_) || !Stands(head_);
}

LogFile::Result LogFile::Restart() {
  offset_ = 0;
  head_ = Mark();
  tail_ = Mark();
  return Result::kRestarted;
}

void LogFile::Remember(const std::string& data) {
  if (head_.bytes.size() < kMarkSize) {
    // It grows with the first reads only, which are those of its place.
    head_.bytes.append(data, 0, kMarkSize - head_.bytes.size());
  }
  tail_.bytes.append(data, data.size() - std::min(data.size(), kMarkSize), kMarkSize);
  tail_.bytes.erase(0, tail_.bytes.size() - std::min(tail_.bytes.size(), kMarkSize));
  offset_ += static_cast<off_t>(data.size());
  tail_.offset = offset_ - static_cast<off_t>(tail_.bytes.size());
}

LogFile::Result LogFile::Read(std::string* data) {
  if (Truncated()) return Restart();
  *data = ReadAt(fd_.Get(), offset_, kPiece);
  if (data->empty()) return Result::kNothing;
  // Truncated meanwhile: what was read may be of the old contents, and is then to be had nowhere
  // else, or of the new, and will be read again from their beginning.
  if (Truncated() && ReadAt(fd_.Get(), offset_, data->size()) == *data) return Restart();
  Remember(*data);
  return Result::kData;
}

off_t LogFile::Unread() const {
  struct stat status = {};
  if (fstat(fd_.Get(), &status) != 0) return 0;
  return std::max<off_t>(status.st_size - offset_, 0);
}

bool LogFile::Removed() const {
  struct stat status = {};
  return fstat(fd_.Get(), &status) == 0 && status.st_nlink == 0;
}

bool LogFile::Is(const struct stat& status) const {
  struct stat own = {};
  return fstat(fd_.Get(), &own) == 0 && own.st_dev == status.st_dev && own.st_ino == status.st_ino;
}
