// Completion in shells: each has a small script that asks the tool itself, "TOOL __complete
// WORD...".
#ifndef TARNWICK_TOOLS_COMMON_COMPLETION_H_
#define TARNWICK_TOOLS_COMMON_COMPLETION_H_

#include <CLI/CLI.hpp>
#include <map>
#include <string>
#include <vector>

// The values of options and arguments, by the name that the parser has for them ("--category", or
// "levels" for a positional argument). A sub-command's own entry is "set:levels", which goes before
// one without the sub-command.
//
// A value has no blanks. Lists with commas complete after each comma. Where a value has the form
// NAME=VALUE, the names are the entry "set:levels" and the values the entry "set:levels=". The
// single value kCompleteFiles stands for the names of files.
using CompletionWords = std::map<std::string, std::vector<std::string>>;
constexpr char kCompleteFiles[] = "@file";

// The candidates for the last of `typed`, the words of a command line after the tool's name up to
// the cursor; one that begins anew is empty. Each candidate replaces the whole word and stands on a
// line, with a tab and a description if it has one; what ends in "=" is to be continued.
// kCompleteFiles alone stands for the names of files.
std::string CompletionCandidates(const CLI::App& app, const CompletionWords& words,
                                 std::vector<std::string> typed);

// REQUIRES: `shell` is "bash", "zsh" or "fish".
std::string CompletionScript(const std::string& tool, const std::string& shell);

// Adds the option --completion SHELL to `app`: parsing it prints the script and ends the program as
// --help does.
void AddCompletion(CLI::App* app);

#endif  // TARNWICK_TOOLS_COMMON_COMPLETION_H_
