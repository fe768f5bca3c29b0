#include "tools/common/completion_model.h"

namespace {

std::string Quote(const std::string& text) {
  std::string result = "'";
  for (const char letter : text) {
    if (letter == '\'' || letter == '\\') result += '\\';
    result += letter;
  }
  return result + "'";
}

// Fish runs these for the candidates of a value: what was typed in front of the last comma, or of
// the "=", goes in front of each.
constexpr char kFunctions[] = R"(function _PROGRAM_list
    set -l token (commandline -ct | string replace -r -- '^--[^=]*=' '')
    set -l base (string match -r -- '^.*,' $token)
    printf "$base%s\n" $argv
end

function _PROGRAM_assign
    set -l token (commandline -ct | string replace -r -- '^--[^=]*=' '')
    set -l base (string match -r -- '^.*=' $token)
    if test -n "$base"
        printf "$base%s\n" (string split ' ' -- $argv[2])
    else
        _PROGRAM_list (string split ' ' -- $argv[1])=
    end
end

)";

std::string CandidatesOf(const CompletedValue& value) {
  if (value.words.empty()) return "";
  if (value.words.front() == "@file") return " -F";
  const std::string words = JoinWords(value.words);
  if (value.assigned.empty()) return " -a " + Quote("(_PROGRAM_list " + words + ")");
  const std::string both = Quote(words) + " " + Quote(JoinWords(value.assigned));
  return " -a " + Quote("(_PROGRAM_assign " + both + ")");
}

// The condition under which a sub-command's lines apply. A program without sub-commands needs none.
std::string ConditionOf(const CompletedProgram& program, const CompletedCommand& command) {
  if (program.commands.size() == 1) return "";
  if (command.name.empty()) return " -n __fish_use_subcommand";
  return " -n " + Quote("__fish_seen_subcommand_from " + command.name);
}

std::string OptionLine(const std::string& start, const CompletedOption& option) {
  std::string line = start;
  for (const std::string& name : option.names) {
    const bool is_long = name.compare(0, 2, "--") == 0;
    line += (is_long ? " -l " : " -s ") + name.substr(is_long ? 2 : 1);
  }
  if (option.takes_value) line += " -r" + CandidatesOf(option.value);
  return line + " -d " + Quote(option.description) + "\n";
}

std::string CommandLines(const CompletedProgram& program, const CompletedCommand& command) {
  std::string lines;
  const std::string start = "complete -c " + program.name;
  if (!command.name.empty()) {
    lines += start + " -n __fish_use_subcommand -a " + command.name + " -d " +
             Quote(command.description) + "\n";
  }
  const std::string conditioned = start + ConditionOf(program, command);
  for (const CompletedOption& option : command.options) lines += OptionLine(conditioned, option);
  for (const CompletedArgument& argument : command.arguments) {
    const std::string candidates = CandidatesOf(argument.value);
    if (!candidates.empty()) lines += conditioned + candidates + "\n";
  }
  return lines;
}

}  // namespace

std::string JoinWords(const std::vector<std::string>& words) {
  std::string joined;
  for (const std::string& word : words) joined += (joined.empty() ? "" : " ") + word;
  return joined;
}

std::string ForProgram(std::string text, const CompletedProgram& program) {
  std::string name = program.name;
  for (char& letter : name) {
    if (letter == '-') letter = '_';
  }
  constexpr std::string_view kPlaceholder = "_PROGRAM";
  for (size_t at = text.find(kPlaceholder); at != std::string::npos;
       at = text.find(kPlaceholder, at + name.size())) {
    text.replace(at, kPlaceholder.size(), "_" + name);
  }
  return text;
}

std::string FishCompletion(const CompletedProgram& program) {
  std::string script = "# Completion of " + program.name + " for fish.\n";
  script += kFunctions;
  script += "complete -c " + program.name + " -f\n";
  for (const CompletedCommand& command : program.commands) {
    script += CommandLines(program, command);
  }
  return ForProgram(script, program);
}
