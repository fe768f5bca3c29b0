#include "tools/common/parser.h"

#include <cstdio>
#include <string>
#include <vector>

#include "tarnwick/version.h"
#include "tools/common/terminal.h"
#include "tools/common/text.h"

namespace {

// The sub-command that the arguments named, because its --help is the one to read.
std::string NameWithCommand(const CLI::App& app) {
  const auto parsed = app.get_subcommands();
  return app.get_name() + (parsed.empty() ? "" : " " + parsed.front()->get_name());
}

// A word in the place of the sub-command that is none; without this, the parser would only miss
// one.
// Results: empty when the mistake is another one.
std::string UnknownCommand(const CLI::App& app, int argc, char** argv) {
  std::vector<std::string> names;
  for (const CLI::App* command : app.get_subcommands([](const CLI::App*) { return true; })) {
    if (!command->get_name().empty()) names.push_back(command->get_name());
  }
  if (names.empty() || argc < 2 || argv[1][0] == '-' || !app.get_subcommands().empty()) return "";
  std::string text = "unknown sub-command \"" + std::string(argv[1]) + "\"";
  const std::string hint = DidYouMean(argv[1], names);
  return hint.empty() ? text : text + " (" + hint + ")";
}

}  // namespace

void AddVersionFlag(CLI::App* app) {
  app->set_version_flag("--version",
                        app->get_name() + " " + std::to_string(TARNWICK_VERSION_MAJOR) + "." +
                            std::to_string(TARNWICK_VERSION_MINOR) + "." +
                            std::to_string(TARNWICK_VERSION_PATCH),
                        "print the version");
}

std::optional<int> ParseArguments(CLI::App* app, const CompletionWords& words, int argc,
                                  char** argv) try {
  if (argc > 1 && std::string(argv[1]) == "__complete") {
    fputs(CompletionCandidates(*app, words, {argv + 2, argv + argc}).c_str(), stdout);
    return 0;
  }
  app->parse(argc, argv);
  return std::nullopt;
} catch (const CLI::RuntimeError& error) {
  return error.get_exit_code();
} catch (const CLI::ParseError& error) {
  if (error.get_exit_code() == static_cast<int>(CLI::ExitCodes::Success)) return app->exit(error);
  const std::string unknown = UnknownCommand(*app, argc, argv);
  PrintError(app->get_name(), unknown.empty() ? error.what() : unknown);
  PrintError(app->get_name(), "try \"" + NameWithCommand(*app) + " --help\"");
  return 2;
}
