#include "tarnwick/platform/fd_set.h"

#include <algorithm>
#include <cstdlib>

namespace {

fd_mask BitOf(int fd) {
  return static_cast<fd_mask>(1UL << (fd % NFDBITS));
}

}  // namespace

size_t FdSet::WordsFor(int fd) {
  return static_cast<size_t>(fd) / NFDBITS + 1;
}

// Of the fd_set only the words are set that select looks at.
FdSet::FdSet(int fd) : m_fd(fd), m_words(m_small.fds_bits) {
  if (fd < FD_SETSIZE) {
    std::fill_n(m_words, WordsFor(fd), 0);
    return;
  }
  m_large.reset(static_cast<fd_mask*>(std::calloc(WordsFor(fd), sizeof(fd_mask))));
  m_words = m_large.get();
}

void FdSet::Fill() {
  std::fill_n(m_words, WordsFor(m_fd), 0);
  m_words[m_fd / NFDBITS] = BitOf(m_fd);
}

bool FdSet::Contains() const {
  return (m_words[m_fd / NFDBITS] & BitOf(m_fd)) != 0;
}
