// The tables for people and for programs.
#ifndef TARNWICK_TOOLS_TWCAMSIM_LISTS_H_
#define TARNWICK_TOOLS_TWCAMSIM_LISTS_H_

// Each prints its table to standard output, as text or as one JSON object a line.
// Results: false when standard output is gone.
bool ListFaults(bool json);
bool ListProfiles(bool json);
bool ListLogins(bool json);

#endif  // TARNWICK_TOOLS_TWCAMSIM_LISTS_H_
