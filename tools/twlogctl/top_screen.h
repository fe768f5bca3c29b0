// Draws top.
#ifndef TARNWICK_TOOLS_TWLOGCTL_TOP_SCREEN_H_
#define TARNWICK_TOOLS_TWLOGCTL_TOP_SCREEN_H_

#include <string>

#include "tools/twlogctl/top_model.h"

// Draws in the colours of the levels from now on, if the terminal has any.
void StartScreenColours();

// `log` is the path of the log, with what is wrong with it if anything is.
void DrawTop(const TopModel& model, const std::string& log);

// How many categories the screen shows at its present size.
size_t CategoryRows();

#endif  // TARNWICK_TOOLS_TWLOGCTL_TOP_SCREEN_H_
