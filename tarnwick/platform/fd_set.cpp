#include "tarnwick/platform/fd_set.h"

#include <algorithm>
#include <cstdlib>

namespace tarnwick {

// Of the fd_set only the words are set that select looks at.
FdSet::FdSet(int fd)
    : m_fd(fd),
      m_word(static_cast<size_t>(fd) / NFDBITS),
      m_bit(static_cast<fd_mask>(1UL << (static_cast<size_t>(fd) % NFDBITS))),
      m_words(m_small.fds_bits) {
  if (fd < FD_SETSIZE) {
    std::fill_n(m_words, m_word + 1, 0);
    return;
  }
  m_large.reset(static_cast<fd_mask*>(std::calloc(m_word + 1, sizeof(fd_mask))));
  m_words = m_large.get();
}

}  // namespace tarnwick
