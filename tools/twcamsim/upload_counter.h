// Counts a streamed upload, whose announced length says nothing.
#ifndef TARNWICK_TOOLS_TWCAMSIM_UPLOAD_COUNTER_H_
#define TARNWICK_TOOLS_TWCAMSIM_UPLOAD_COUNTER_H_

#include <cstdint>
#include <string>

#include "tools/twcamsim/profile.h"

struct UploadCount {
  uint64_t bytes = 0;
  std::string end;  // "closed" after the closing boundary, "full" after `most` bytes or the
                    // announced length, "cut" where the peer's direction ended before
};

// Reads from `source` up to the closing boundary that the request's Content-Type names, to `most`
// bytes (0: no limit), to the announced length or to the end.
UploadCount CountUpload(const Request& request, uint64_t most, const BodySource& source);

#endif  // TARNWICK_TOOLS_TWCAMSIM_UPLOAD_COUNTER_H_
