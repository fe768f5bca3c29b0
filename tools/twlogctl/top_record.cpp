#include "tools/twlogctl/top_record.h"

#include <sys/shm.h>

#include <cstdint>

bool TopRecord::Attach(int id, int flags) {
  void* const address = shmat(id, nullptr, flags);
  if (reinterpret_cast<intptr_t>(address) == -1) return false;
  m_record.reset(static_cast<TWDbgLogCfg*>(address));
  m_id = id;
  m_writable = (flags & SHM_RDONLY) == 0;
  return true;
}

void TopRecord::Refresh() {
  const std::optional<RecordSegment> segment = FindRecord();
  const bool usable = segment && segment->HasRightSize();
  if (m_record != nullptr && (!usable || segment->id != m_id)) m_record.reset();
  if (!usable) {
    m_note = segment ? "a record of a wrong size: levels are read only"
                     : "no record of levels: read only, everything stands at notice";
    return;
  }
  if (m_record == nullptr && !Attach(segment->id, 0)) Attach(segment->id, SHM_RDONLY);
  if (m_record == nullptr) {
    m_note = "the record may not be read: read only";
  } else {
    m_note = m_writable ? "record of levels attached" : "the record may not be changed: read only";
  }
}

int TopRecord::Level(LOG_CATEG category) const {
  return m_record != nullptr ? m_record->Level(category) : static_cast<int>(LOG_LEVEL_NOTICE);
}

bool TopRecord::SetLevel(LOG_CATEG category, int level) {
  if (m_record == nullptr || !m_writable) return false;
  m_record->SetLevel(category, level);
  return true;
}
