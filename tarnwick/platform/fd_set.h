// A descriptor set for select(2) that has room for its one descriptor, whatever its number.
#ifndef TARNWICK_PLATFORM_FD_SET_H_
#define TARNWICK_PLATFORM_FD_SET_H_

#include <sys/select.h>

#include "tarnwick/platform/unique.h"

namespace tarnwick {

// fd_set ends at descriptor 1,023, and a daemon with many cameras has more. Small descriptors use
// the fd_set inside the object, so that a wait allocates nothing.
class FdSet {
 public:
  // An empty set with room for `fd`. REQUIRES: fd >= 0.
  explicit FdSet(int fd);

  // False when there was no memory for a large descriptor; the set must not be used then.
  bool Valid() const { return m_words != nullptr; }

  // Makes the set hold its descriptor. No other can be in it: select only takes out.
  void Fill() { m_words[m_word] = m_bit; }

  bool Contains() const { return (m_words[m_word] & m_bit) != 0; }

  // For select, with Count() as the first argument.
  fd_set* Get() { return reinterpret_cast<fd_set*>(m_words); }
  int Count() const { return m_fd + 1; }

 private:
  int m_fd;
  size_t m_word;  // where the descriptor is, and its bit there
  fd_mask m_bit;
  fd_set m_small;
  UniqueMalloc<fd_mask> m_large;
  fd_mask* m_words;
};

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_FD_SET_H_
