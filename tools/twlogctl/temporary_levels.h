// Levels that go back by themselves.
//
// The process that puts them back is a child in a session of its own, so neither Ctrl-C nor the end
// of the terminal reaches it, and it has a socket whose other end only its parent has: when the
// parent is gone, even by SIGKILL, the child reads the end of the stream and acts at once.
#ifndef TARNWICK_TOOLS_TWLOGCTL_TEMPORARY_LEVELS_H_
#define TARNWICK_TOOLS_TWLOGCTL_TEMPORARY_LEVELS_H_

#include <chrono>
#include <functional>
#include <vector>

#include "tools/twlogctl/level_plan.h"

enum class TemporaryEnd {
  kTimePassed,
  kInterrupted,     // by a signal to this process
  kReverterKilled,  // this process has put the levels back in its place, before the time
  kNoReverter,      // it could not be started; nothing was changed
};

struct TemporaryResult {
  TemporaryEnd end;
  int signal = 0;                 // the one that interrupted
  std::vector<LevelChange> left;  // what does not stand at its old level, because others changed it
};

// Sets the changed levels in `record`, calls `started`, waits for `span` or a signal (SIGINT,
// SIGTERM, SIGHUP, SIGQUIT), and has the old levels back before it returns. A level that is not the
// one that was set is somebody else's by then, and left alone.
TemporaryResult SetTemporarily(TWDbgLogCfg* record, const std::vector<LevelChange>& changes,
                               std::chrono::milliseconds span,
                               const std::function<void()>& started);

#endif  // TARNWICK_TOOLS_TWLOGCTL_TEMPORARY_LEVELS_H_
