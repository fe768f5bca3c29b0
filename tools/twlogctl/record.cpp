#include "tools/twlogctl/record.h"

#include <sys/ipc.h>
#include <sys/shm.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <sstream>

#include "tools/twlogctl/processes.h"
#include "tools/twlogctl/report.h"

namespace {

// shmctl asks for the permission to read; this table shows everything to everybody.
std::optional<RecordSegment> FindInTable(int id) {
  std::ifstream table("/proc/sysvipc/shm");
  std::string line;
  std::getline(table, line);  // the headings
  while (std::getline(table, line)) {
    std::istringstream fields(line);
    RecordSegment segment;
    long key = 0, maker = 0, last = 0;
    fields >> key >> segment.id >> std::oct >> segment.mode >> std::dec >> segment.size >> maker >>
        last >> segment.attached >> segment.owner >> segment.group >> segment.creator;
    if (fields && segment.id == id) return segment;
  }
  return std::nullopt;
}

}  // namespace

std::optional<uid_t> RecordSegment::Stranger() const {
  for (const uid_t user : {creator, owner}) {
    if (!IsRootOrCaller(user)) return user;
  }
  return std::nullopt;
}

std::optional<RecordSegment> FindRecord() {
  const int id = shmget(TWShmDbgLogIPCKey(), 0, 0);
  if (id == -1) return std::nullopt;
  struct shmid_ds state = {};
  if (shmctl(id, IPC_STAT, &state) == -1) return FindInTable(id);
  RecordSegment segment;
  segment.id = id;
  segment.size = state.shm_segsz;
  segment.owner = state.shm_perm.uid;
  segment.creator = state.shm_perm.cuid;
  segment.group = state.shm_perm.gid;
  segment.mode = state.shm_perm.mode & 0777;
  segment.attached = state.shm_nattch;
  return segment;
}

unsigned long AttachedOthers(const RecordSegment& segment) {
  const unsigned long own = g_pDbgLogCfg != nullptr ? 1 : 0;
  return segment.attached > own ? segment.attached - own : 0;
}

std::string DescribeAttached(const RecordSegment& segment) {
  const unsigned long count = AttachedOthers(segment);
  std::string names;
  for (const LibraryUser& user : LibraryUsers(segment.id)) {
    if (!user.has_record) continue;
    names += (names.empty() ? ": " : ", ") + NameAndPid(user.process);
  }
  return std::to_string(count) + (count == 1 ? " process" : " processes") + names;
}

void RecordDetacher::operator()(const TWDbgLogCfg* record) const {
  if (record != g_pDbgLogCfg) shmdt(record);
}

AttachedRecord Attach(const RecordSegment& segment, int flags) {
  void* const address = shmat(segment.id, nullptr, flags);
  if (reinterpret_cast<intptr_t>(address) == -1) return nullptr;
  return AttachedRecord(static_cast<TWDbgLogCfg*>(address));
}

AttachedRecord AttachRecord(Access access) {
  const std::optional<RecordSegment> segment = FindRecord();
  if (!segment) {
    Complain("there is no record of levels; \"twlogctl create\" makes one");
    return nullptr;
  }
  if (!segment->HasRightSize()) {
    Complain("the record has " + std::to_string(segment->size) + " bytes in place of " +
             std::to_string(sizeof(TWDbgLogCfg)) + "; \"twlogctl doctor\" tells what to do");
    return nullptr;
  }
  // The library has it already, unless it may only be read. A second time would show as another
  // process.
  if (g_pDbgLogCfg != nullptr) return AttachedRecord(g_pDbgLogCfg);
  AttachedRecord record = Attach(*segment, access == Access::kRead ? SHM_RDONLY : 0);
  if (!record) {
    const int error = errno;
    Complain(std::string("the record may not be ") +
             (access == Access::kRead ? "read: " : "changed: ") + strerror(error) +
             "; it belongs to " + UserName(segment->owner) + ":" + GroupName(segment->group) +
             " with mode " + ModeText(segment->mode));
  }
  return record;
}
