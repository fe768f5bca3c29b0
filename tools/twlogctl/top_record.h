// The shared record as top uses it: it may come, go and be replaced meanwhile.
#ifndef TARNWICK_TOOLS_TWLOGCTL_TOP_RECORD_H_
#define TARNWICK_TOOLS_TWLOGCTL_TOP_RECORD_H_

#include <string>

#include "tools/twlogctl/record.h"

class TopRecord {
 public:
  // Attaches the record that there is now: for writing, or for reading when that is all this user
  // may do.
  void Refresh();

  // What a daemon with this record does; notice without a record.
  int Level(LOG_CATEG category) const;

  // Results: false when the record cannot be changed, for the reason in Note().
  bool SetLevel(LOG_CATEG category, int level);

  // How it stands, in a few words.
  const std::string& Note() const { return note_; }

 private:
  AttachedRecord record_;
  int id_ = -1;
  bool writable_ = false;
  std::string note_;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_TOP_RECORD_H_
