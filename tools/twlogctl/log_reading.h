// Reads a log once, from its beginning to its end.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_READING_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_READING_H_

#include <string>

#include "tools/twlogctl/log_filter.h"
#include "tools/twlogctl/log_select.h"

// Hands on the wanted messages of the log at `path`, a file or a pipe, or of standard input for
// "-". Lines get their years by the time of the file's last change, so that an old log that was
// copied with its times is read as it was then.
// Results: 0 or an errno.
int ReadLog(const std::string& path, const LogFilter& filter, const WantedSink& sink);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_READING_H_
