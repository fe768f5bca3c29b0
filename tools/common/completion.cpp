#include "tools/common/completion.h"

#include <cstdio>

namespace {

// The first sentence: a list of candidates has a line for each.
std::string FirstSentence(const std::string& text) {
  const std::string line = text.substr(0, text.find('\n'));
  const size_t end = line.find(". ");
  if (end != std::string::npos) return line.substr(0, end);
  return !line.empty() && line.back() == '.' ? line.substr(0, line.size() - 1) : line;
}

bool StartsWith(const std::string& text, const std::string& start) {
  return text.compare(0, start.size(), start) == 0;
}

// What a command line asks for: an option or an argument that takes a value, the name of an option,
// or a sub-command.
class Completer {
 public:
  Completer(const CLI::App& app, const CompletionWords& words) : command_(&app), words_(words) {}

  std::string Complete(const std::vector<std::string>& typed) {
    for (size_t i = 0; i + 1 < typed.size(); ++i) Pass(typed[i]);
    const std::string& last = typed.back();
    const size_t equals = last.find('=');
    if (!waiting_.empty()) {
      AddValues(waiting_, "", last);
    } else if (StartsWith(last, "--") && equals != std::string::npos) {
      AddValues(last.substr(0, equals), last.substr(0, equals + 1), last.substr(equals + 1));
    } else if (StartsWith(last, "-")) {
      AddOptions(*command_, last);
    } else if (ExpectsCommand()) {
      for (const CLI::App* each : Commands()) Add(each->get_name(), each->get_description(), last);
    } else {
      AddValues(ArgumentName(), "", last);
    }
    return candidates_;
  }

 private:
  // An option group is a sub-command without a name.
  std::vector<const CLI::App*> Commands() const {
    return command_->get_subcommands(
        [](const CLI::App* each) { return !each->get_name().empty(); });
  }
  static std::vector<const CLI::App*> Groups(const CLI::App& command) {
    return command.get_subcommands([](const CLI::App* each) { return each->get_name().empty(); });
  }

  bool ExpectsCommand() const { return command_->get_parent() == nullptr && !Commands().empty(); }

  void Pass(const std::string& word) {
    if (!waiting_.empty()) {
      waiting_.clear();
    } else if (StartsWith(word, "-")) {
      const CLI::Option* const option = command_->get_option_no_throw(word);
      if (option != nullptr && option->get_items_expected_max() > 0) waiting_ = word;
    } else if (ExpectsCommand()) {
      for (const CLI::App* each : Commands()) {
        if (each->get_name() == word) command_ = each;
      }
    } else {
      ++arguments_;
    }
  }

  // The positional argument at the cursor; the last one may repeat.
  std::string ArgumentName() const {
    size_t position = 0;
    for (const CLI::Option* option : command_->get_options()) {
      if (!option->get_positional()) continue;
      const bool repeats = option->get_items_expected_max() > 1;
      if (position++ == arguments_ || repeats) return option->get_name(true);
    }
    return "";
  }

  void AddOptions(const CLI::App& command, const std::string& start) {
    for (const CLI::Option* option : command.get_options()) {
      if (option->get_group().empty() || !option->nonpositional()) continue;
      for (const std::string& name : option->get_snames()) {
        Add("-" + name, option->get_description(), start);
      }
      for (const std::string& name : option->get_lnames()) {
        Add("--" + name, option->get_description(), start);
      }
    }
    for (const CLI::App* group : Groups(command)) AddOptions(*group, start);
  }

  void Add(const std::string& name, const std::string& description, const std::string& start) {
    if (StartsWith(name, start)) candidates_ += name + "\t" + FirstSentence(description) + "\n";
  }

  // The values of an option or argument that begin as `typed` does; `prefix` stands before it.
  void AddValues(const std::string& name, const std::string& prefix, const std::string& typed) {
    if (WordsOf(name) == std::vector<std::string>{kCompleteFiles}) {
      candidates_ = std::string(kCompleteFiles) + "\n";
      return;
    }
    const std::vector<std::string> assigned = WordsOf(name, "=");
    const bool assigns = !assigned.empty() && typed.find('=') != std::string::npos;
    const size_t base = typed.rfind(assigns ? '=' : ',') + 1;  // 0 without one
    const char* const end = assigned.empty() || assigns ? "\n" : "=\n";
    for (const std::string& value : assigns ? assigned : WordsOf(name)) {
      if (!StartsWith(value, typed.substr(base))) continue;
      candidates_.append(prefix).append(typed, 0, base).append(value).append(end);
    }
  }

  // By any of the names of the option, or by the name of the argument.
  std::vector<std::string> WordsOf(const std::string& typed, const std::string& suffix = "") const {
    std::vector<std::string> names = {typed};
    const CLI::Option* const option = command_->get_option_no_throw(typed);
    if (option != nullptr) {
      for (const std::string& name : option->get_lnames()) names.push_back("--" + name);
    }
    for (const std::string& name : names) {
      for (const std::string& key : {command_->get_name() + ":" + name, name}) {
        const auto found = words_.find(key + suffix);
        if (found != words_.end()) return found->second;
      }
    }
    return {};
  }

  const CLI::App* command_;
  const CompletionWords& words_;
  std::string waiting_;   // the option whose value comes next
  size_t arguments_ = 0;  // positional ones before the cursor
  std::string candidates_;
};

}  // namespace

std::string CompletionCandidates(const CLI::App& app, const CompletionWords& words,
                                 std::vector<std::string> typed) {
  if (typed.empty()) typed.emplace_back();
  CompletionWords all = words;
  all["--completion"] = {"bash", "zsh", "fish"};
  return Completer(app, all).Complete(typed);
}

void AddCompletion(CLI::App* app) {
  const auto print = [app](const std::string& shell) {
    const std::string script = CompletionScript(app->get_name(), shell);
    if (fputs(script.c_str(), stdout) < 0 || fflush(stdout) != 0) throw CLI::RuntimeError(1);
    throw CLI::Success();
  };
  app->add_option_function<std::string>(
         "--completion", print, "Print the completion script of a shell: bash, zsh or fish.")
      ->type_name("SHELL")
      ->check(CLI::IsMember({"bash", "zsh", "fish"}));
}
