// What a run may leave behind in the process and in the folders that it writes to.
#ifndef TARNWICK_TESTS_TORTURE_TRACES_H_
#define TARNWICK_TESTS_TORTURE_TRACES_H_

#include <signal.h>

#include <map>
#include <set>
#include <string>

// The state of the process that an operation has to leave as it found it.
struct Traces {
  std::map<int, std::string> descriptors;
  std::set<std::string> files;  // in the folders of the settings and the temporary files
  long threads = 0;
  sigset_t blocked = {};
  void (*on_sigpipe)(int) = nullptr;
  bool attached = false;  // to the record of levels
};

Traces TakeTraces();

// What the second has that the first had not; empty when nothing has changed. `with_files` false
// leaves the files out.
std::string DifferenceOf(const Traces& before, const Traces& after, bool with_files);

// Names a lock of the log's or the settings' files that somebody holds; empty when they are free.
std::string HeldLock();

// Gives the calling process empty folders of its own for the log, the settings and the temporary
// files, and a namespace of its own for the record. REQUIRES: the process runs in the sandbox.
// Results: false when the system does not let it.
bool IsolateProcess();

#endif  // TARNWICK_TESTS_TORTURE_TRACES_H_
