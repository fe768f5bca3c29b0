// From what was observed to a recording.
#ifndef TARNWICK_TOOLS_TWHTTP_RECORD_H_
#define TARNWICK_TOOLS_TWHTTP_RECORD_H_

#include <vector>

#include "tools/common/recording.h"
#include "tools/twhttp/session.h"

std::vector<RecordedExchange> RecordingOf(const Session& session);

#endif  // TARNWICK_TOOLS_TWHTTP_RECORD_H_
