// Wakes a reader of logs when there may be something new.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_WATCH_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_WATCH_H_

#include <string>

#include "tarnwick/platform/unique.h"

// Events are hints: whoever was woken looks at the files themselves, and looks at them now and then
// without an event too, because network file systems send none and queues overflow.
class LogWatch {
 public:
  LogWatch();

  // The directory's entries that come, go and change their names. Repeated calls follow a directory
  // that was removed and made again.
  void AddDirectory(const std::string& path);

  // The changes of an open file, whatever its name. Results: for Remove; -1 when there is none.
  int AddFile(int fd);
  void Remove(int watch);

  // Readable when there are events; -1 when the system has no more watches.
  int Descriptor() const { return fd_.Get(); }

  // Takes the events off.
  void Drain();

 private:
  tarnwick::UniqueFd fd_;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_WATCH_H_
