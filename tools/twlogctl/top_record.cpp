#include "tools/twlogctl/top_record.h"

#include <sys/shm.h>

void TopRecord::Refresh() {
  const std::optional<RecordSegment> segment = FindRecord();
  const bool usable = segment && segment->HasRightSize();
  if (record_ != nullptr && (!usable || segment->id != id_)) record_.reset();
  if (!usable) {
    note_ = segment ? "a record of a wrong size: levels are read only"
                    : "no record of levels: read only, everything stands at notice";
    return;
  }
  if (record_ == nullptr) {
    id_ = segment->id;
    record_ = Attach(*segment, 0);
    writable_ = record_ != nullptr;
    if (!writable_) record_ = Attach(*segment, SHM_RDONLY);
  }
  if (record_ == nullptr) {
    note_ = "the record may not be read: read only";
  } else {
    note_ = writable_ ? "record of levels attached" : "the record may not be changed: read only";
  }
}

int TopRecord::Level(LOG_CATEG category) const {
  return record_ != nullptr ? record_->Level(category) : static_cast<int>(LOG_LEVEL_NOTICE);
}

bool TopRecord::SetLevel(LOG_CATEG category, int level) {
  if (record_ == nullptr || !writable_) return false;
  record_->SetLevel(category, level);
  return true;
}
