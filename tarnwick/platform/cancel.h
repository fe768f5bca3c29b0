// Cancellation (pthread_cancel) is held off where it would lose something.
#ifndef TARNWICK_PLATFORM_CANCEL_H_
#define TARNWICK_PLATFORM_CANCEL_H_

#include <pthread.h>

namespace tarnwick {

// While one exists, the calling thread is not cancelled; a cancel that comes meanwhile acts at the
// next cancellation point after it. It belongs around
// - calls that acquire or release something: glibc before 2.41 may cancel a thread between the
//   system call that opens a descriptor and the return of its number (bug 12683),
// - calls into other libraries, which do not expect to be left by unwinding,
// - cancellation points in destructors, which must not be left at all.
class NoCancel {
 public:
  NoCancel() { pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &m_before); }
  ~NoCancel() { pthread_setcancelstate(m_before, nullptr); }
  NoCancel(const NoCancel&) = delete;
  NoCancel& operator=(const NoCancel&) = delete;

 private:
  int m_before;
};

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_CANCEL_H_
