#include "tools/common/completion.h"

#include <cstdio>
#include <stdexcept>
#include <utility>

#include "tools/common/completion_model.h"

namespace {

// The first sentence: a list of candidates has a line for each.
std::string FirstSentence(const std::string& text) {
  const std::string line = text.substr(0, text.find('\n'));
  const size_t end = line.find(". ");
  if (end != std::string::npos) return line.substr(0, end);
  return !line.empty() && line.back() == '.' ? line.substr(0, line.size() - 1) : line;
}

class ModelBuilder {
 public:
  explicit ModelBuilder(const CompletionWords& words) : words_(words) {}

  CompletedCommand Command(const CLI::App& app, bool is_program) {
    CompletedCommand command;
    command.name = is_program ? "" : app.get_name();
    command.description = FirstSentence(app.get_description());
    AddOptions(app, &command);
    return command;
  }

 private:
  void AddOptions(const CLI::App& app, CompletedCommand* command) {
    for (const CLI::Option* option : app.get_options()) {
      if (option->get_group().empty()) continue;  // hidden
      if (option->nonpositional()) command->options.push_back(Option(*option, command->name));
      if (option->get_positional()) {
        command->arguments.push_back(
            {Value(option->get_name(true), command->name), option->get_items_expected_max() > 1});
      }
    }
    // An option group is a sub-command without a name.
    const auto is_group = [](const CLI::App* group) { return group->get_name().empty(); };
    for (const CLI::App* group : app.get_subcommands(is_group)) AddOptions(*group, command);
  }

  CompletedOption Option(const CLI::Option& option, const std::string& command) {
    CompletedOption completed;
    completed.description = FirstSentence(option.get_description());
    completed.takes_value = option.get_items_expected_max() > 0;
    for (const std::string& name : option.get_snames()) completed.names.push_back("-" + name);
    for (const std::string& name : option.get_lnames()) completed.names.push_back("--" + name);
    for (const std::string& name : completed.names) {
      if (completed.value.words.empty()) completed.value = Value(name, command);
    }
    return completed;
  }

  CompletedValue Value(const std::string& name, const std::string& command) {
    std::string own = command;
    own += ":" + name;
    const std::string& key = words_.count(own) > 0 ? own : name;
    return {WordsOf(key), WordsOf(key + "=")};
  }

  std::vector<std::string> WordsOf(const std::string& key) {
    const auto words = words_.find(key);
    return words == words_.end() ? std::vector<std::string>() : words->second;
  }

  const CompletionWords& words_;
};

CompletedProgram ProgramOf(const CLI::App& app, const CompletionWords& words) {
  ModelBuilder builder(words);
  CompletedProgram program;
  program.name = app.get_name();
  program.commands.push_back(builder.Command(app, true));
  const auto has_name = [](const CLI::App* command) {
    return !command->get_name().empty() && !command->get_group().empty();
  };
  for (const CLI::App* command : app.get_subcommands(has_name)) {
    program.commands.push_back(builder.Command(*command, false));
  }
  return program;
}

}  // namespace

std::string CompletionScript(const CLI::App& app, const std::string& shell,
                             const CompletionWords& words) {
  const CompletedProgram program = ProgramOf(app, words);
  if (shell == "bash") return BashCompletion(program);
  if (shell == "zsh") return ZshCompletion(program);
  if (shell == "fish") return FishCompletion(program);
  throw std::invalid_argument("no completion for the shell " + shell);
}

void AddCompletion(CLI::App* app, CompletionWords words) {
  words["--completion"] = {"bash", "zsh", "fish"};
  const auto print = [app, words = std::move(words)](const std::string& shell) {
    const std::string script = CompletionScript(*app, shell, words);
    if (fputs(script.c_str(), stdout) < 0 || fflush(stdout) != 0) throw CLI::RuntimeError(1);
    throw CLI::Success();
  };
  app->add_option_function<std::string>(
         "--completion", print, "Print the completion script of a shell: bash, zsh or fish.")
      ->type_name("SHELL")
      ->check(CLI::IsMember({"bash", "zsh", "fish"}));
}
