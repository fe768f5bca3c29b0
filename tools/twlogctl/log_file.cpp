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
  return mark.bytes.empty() || ReadAt(m_fd.Get(), mark.offset, mark.bytes.size()) == mark.bytes;
}

bool LogFile::Truncated() const {
  struct stat status = {};
  if (fstat(m_fd.Get(), &status) == 0 && status.st_size < m_offset) return true;
  return !Stands(m_tail) || !Stands(m_head);
}

LogFile::Result LogFile::Restart() {
  m_offset = 0;
  m_head = Mark();
  m_tail = Mark();
  return Result::kRestarted;
}

void LogFile::Remember(const std::string& data) {
  if (m_head.bytes.size() < kMarkSize) {
    // It grows with the first reads only, which are those of its place.
    m_head.bytes.append(data, 0, kMarkSize - m_head.bytes.size());
  }
  m_tail.bytes.append(data, data.size() - std::min(data.size(), kMarkSize), kMarkSize);
  m_tail.bytes.erase(0, m_tail.bytes.size() - std::min(m_tail.bytes.size(), kMarkSize));
  m_offset += static_cast<off_t>(data.size());
  m_tail.offset = m_offset - static_cast<off_t>(m_tail.bytes.size());
}

LogFile::Result LogFile::Read(std::string* data) {
  if (Truncated()) return Restart();
  *data = ReadAt(m_fd.Get(), m_offset, kPiece);
  if (data->empty()) return Result::kNothing;
  // Truncated meanwhile: what was read may be of the old contents, and is then to be had nowhere
  // else, or of the new, and will be read again from their beginning.
  if (Truncated() && ReadAt(m_fd.Get(), m_offset, data->size()) == *data) return Restart();
  Remember(*data);
  return Result::kData;
}

off_t LogFile::Unread() const {
  struct stat status = {};
  if (fstat(m_fd.Get(), &status) != 0) return 0;
  return std::max<off_t>(status.st_size - m_offset, 0);
}

bool LogFile::Removed() const {
  struct stat status = {};
  return fstat(m_fd.Get(), &status) == 0 && status.st_nlink == 0;
}

bool LogFile::Is(const struct stat& status) const {
  struct stat own = {};
  return fstat(m_fd.Get(), &own) == 0 && own.st_dev == status.st_dev && own.st_ino == status.st_ino;
}
