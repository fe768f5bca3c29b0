// The shared record of levels as the system sees it: a segment with an owner, a mode and a size.
#ifndef TARNWICK_TOOLS_TWLOGCTL_RECORD_H_
#define TARNWICK_TOOLS_TWLOGCTL_RECORD_H_

#include <sys/types.h>

#include <cstddef>
#include <memory>
#include <optional>
#include <string>

#include "tarnwick/log/twdebuglog.h"

struct RecordSegment {
  int id = -1;
  size_t size = 0;
  uid_t owner = 0;
  uid_t creator = 0;  // keeps the owner's rights, whoever the owner is
  gid_t group = 0;
  mode_t mode = 0;
  unsigned long attached = 0;  // all processes, this one included when it has the record

  // The user who made it or owns it and is neither root nor this one; nothing when there is none.
  std::optional<uid_t> Stranger() const;

  bool HasRightSize() const { return size == sizeof(TWDbgLogCfg); }
};

// The segment of the record, whatever its size. Anybody may ask, whatever its mode.
// Results: nothing when there is none.
std::optional<RecordSegment> FindRecord();

// How many processes but this one have it attached.
unsigned long AttachedOthers(const RecordSegment& segment);

// "another 2 processes" with their names and numbers, as far as /proc tells them.
std::string DescribeAttached(const RecordSegment& segment);

struct RecordDetacher {
  void operator()(const TWDbgLogCfg* record) const;
};
// Detached at the end of its life, unless it is the library's.
using AttachedRecord = std::unique_ptr<TWDbgLogCfg, RecordDetacher>;

// Attaches `segment`, with SHM_RDONLY in `flags` to read it. Results: null with errno.
AttachedRecord Attach(const RecordSegment& segment, int flags);

enum class Access { kRead, kWrite };

// Attaches the record for a sub-command. Without one, with one of another size and without the
// permission it complains, with what to do about it, and returns null.
AttachedRecord AttachRecord(Access access);

#endif  // TARNWICK_TOOLS_TWLOGCTL_RECORD_H_
