// Completion scripts for shells, made from a parser's own tables.
#ifndef TARNWICK_TOOLS_COMMON_COMPLETION_H_
#define TARNWICK_TOOLS_COMMON_COMPLETION_H_

#include <CLI/CLI.hpp>
#include <map>
#include <string>
#include <vector>

// The words that stand for an option's or argument's values, by the name that the parser gave it
// ("--category", or "levels" for a positional argument). A sub-command's own entry is
// "set:levels", which goes before one without the sub-command.
//
// A word has no blanks. Lists with commas complete after each comma. Where a value has the form
// NAME=VALUE, the names are the entry "set:levels" and the values the entry "set:levels=". The
// single word kCompleteFiles stands for the names of files.
using CompletionWords = std::map<std::string, std::vector<std::string>>;
constexpr char kCompleteFiles[] = "@file";

// The script of `shell` ("bash", "zsh" or "fish") that completes the sub-commands, options and
// values of `app`.
// Throws std::invalid_argument for another shell.
std::string CompletionScript(const CLI::App& app, const std::string& shell,
                             const CompletionWords& words);

// Adds the option --completion SHELL to `app`: parsing it prints the script and ends the program as
// --help does. Options and sub-commands that are added to `app` later are completed too.
void AddCompletion(CLI::App* app, CompletionWords words);

#endif  // TARNWICK_TOOLS_COMMON_COMPLETION_H_
