// What a completion script knows about a program.
#ifndef TARNWICK_TOOLS_COMMON_COMPLETION_MODEL_H_
#define TARNWICK_TOOLS_COMMON_COMPLETION_MODEL_H_

#include <string>
#include <vector>

struct CompletedValue {
  std::vector<std::string> words;
  std::vector<std::string> assigned;  // what stands behind the "=" of a word, if anything does
};

struct CompletedOption {
  std::vector<std::string> names;  // with their dashes
  std::string description;
  bool takes_value = false;
  CompletedValue value;
};

struct CompletedArgument {
  CompletedValue value;
  bool repeats = false;
};

struct CompletedCommand {
  std::string name;  // empty for the program itself
  std::string description;
  std::vector<CompletedOption> options;
  std::vector<CompletedArgument> arguments;
};

struct CompletedProgram {
  std::string name;
  std::vector<CompletedCommand> commands;  // the program itself first, then its sub-commands
};

std::string BashCompletion(const CompletedProgram& program);
std::string ZshCompletion(const CompletedProgram& program);
std::string FishCompletion(const CompletedProgram& program);

// The words with blanks between them.
std::string JoinWords(const std::vector<std::string>& words);

// `text` with each PROGRAM replaced by the name under which shells keep the program's functions.
std::string ForProgram(std::string text, const CompletedProgram& program);

#endif  // TARNWICK_TOOLS_COMMON_COMPLETION_MODEL_H_
