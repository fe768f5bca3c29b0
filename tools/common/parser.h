// The way from a program's arguments to its exit code that all tools share.
#ifndef TARNWICK_TOOLS_COMMON_PARSER_H_
#define TARNWICK_TOOLS_COMMON_PARSER_H_

#include <CLI/CLI.hpp>
#include <optional>

// --version, which prints the tool's name and the version that it was built as.
// REQUIRES: `app` has the tool's name.
void AddVersionFlag(CLI::App* app);

// Parses the arguments, which runs the callbacks of `app`. A mistake is told on standard error as
// "NAME: what is wrong" with a pointer to --help, and is wrong usage: 2. --help and its like print
// and give 0.
// Results: the exit code to end with; nothing when the program is to go on.
// REQUIRES: `app` has the tool's name.
std::optional<int> ParseArguments(CLI::App* app, int argc, char** argv);

#endif  // TARNWICK_TOOLS_COMMON_PARSER_H_
