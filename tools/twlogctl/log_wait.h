// The wait of a program that prints what a log brings.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_WAIT_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_WAIT_H_

#include <chrono>

// Waits until `fd` is readable, but no longer than `patience`. When the reader of standard output
// goes meanwhile, the process ends as by writing to it: `follow | head -1` is not to wait for a
// message that nobody will see.
void WaitForLog(int fd, std::chrono::milliseconds patience);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_WAIT_H_
