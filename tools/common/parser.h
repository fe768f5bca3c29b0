// The way from a program's arguments to its exit code that all tools share.
#ifndef TARNWICK_TOOLS_COMMON_PARSER_H_
#define TARNWICK_TOOLS_COMMON_PARSER_H_

#include <CLI/CLI.hpp>
#include <optional>

#include "tools/common/completion.h"

// --version, which prints the tool's name and the version that it was built as.
// REQUIRES: `app` has the tool's name.
void AddVersionFlag(CLI::App* app);

// Parses the arguments, which runs the callbacks of `app`. A mistake is reported on standard error
// as "NAME: what is wrong" with a hint at --help, and is wrong usage: 2. --help and its like print
// and return 0, and so does __complete, which a shell calls to complete a command line.
// Results: the exit code to end with; nothing when the program is to go on.
// REQUIRES: `app` has the tool's name.
std::optional<int> ParseArguments(CLI::App* app, const CompletionWords& words, int argc,
                                  char** argv);

#endif  // TARNWICK_TOOLS_COMMON_PARSER_H_
