#ifndef TARNWICK_TOOLS_TWLOGCTL_STATUS_H_
#define TARNWICK_TOOLS_TWLOGCTL_STATUS_H_

// Prints the record of levels: what the system knows of its segment, and the levels that are not
// notice, or `all`. Results: the exit code.
int ShowStatus(bool all, bool json);

#endif  // TARNWICK_TOOLS_TWLOGCTL_STATUS_H_
