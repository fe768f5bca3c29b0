// twlogctl: the shared log levels and the logs, for people.
#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>

#include "tools/common/completion.h"
#include "tools/common/names.h"
#include "tools/common/parser.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/report.h"

namespace {

CompletionWords Words() {
  std::vector<std::string> categories_and_all = CategoryNames();
  categories_and_all.push_back("all");
  return {
      {"--category", CategoryNames()},     {"--level", LevelNames()},
      {"set:levels", categories_and_all},  {"set:levels=", LevelNames()},
      {"set:--for", {"5m", "10m", "1h"}},  {"timescale:state", {"on", "off"}},
      {"create:--mode", {"0660", "0600"}}, {"--file", {kCompleteFiles}},
  };
}

void AddCommands(CLI::App* app, int* exit_code) {
  AddStatus(app, exit_code);
  AddCreate(app, exit_code);
  AddRemove(app, exit_code);
  AddSet(app, exit_code);
  AddTimeScale(app, exit_code);
  AddSave(app, exit_code);
  AddLoad(app, exit_code);
  AddDiff(app, exit_code);
  AddFollow(app, exit_code);
  AddShow(app, exit_code);
  AddStats(app, exit_code);
  AddTop(app, exit_code);
  AddWrite(app, exit_code);
  AddDoctor(app, exit_code);
}

}  // namespace

int main(int argc, char** argv) try {
  CLI::App app("Shows and changes the shared log levels, and reads the logs.", "twlogctl");
  app.require_subcommand(1);
  app.footer("Exit codes: 0 done; 1 something is wrong, or nothing was found; 2 wrong usage.");
  AddVersionFlag(&app);
  int exit_code = kExitDone;
  AddCommands(&app, &exit_code);
  AddCompletion(&app);
  if (const auto ended = ParseArguments(&app, Words(), argc, argv)) return *ended;
  if (fflush(stdout) != 0 || ferror(stdout) != 0) {
    Complain("cannot write the output");
    return kExitWrong;
  }
  return exit_code;
} catch (const std::exception& error) {  // memory ran out, or the like
  Complain(error.what());
  return kExitWrong;
}
