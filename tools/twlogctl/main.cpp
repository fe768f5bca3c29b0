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
  std::vector<std::string> categoriesAndAll = CategoryNames();
  categoriesAndAll.push_back("all");
  return {
      {"--category", CategoryNames()},     {"--level", LevelNames()},
      {"set:levels", categoriesAndAll},    {"set:levels=", LevelNames()},
      {"set:--for", {"5m", "10m", "1h"}},  {"timescale:state", {"on", "off"}},
      {"create:--mode", {"0660", "0600"}}, {"--file", {kCompleteFiles}},
  };
}

void AddCommands(CLI::App* app, int* exitCode) {
  AddStatus(app, exitCode);
  AddCreate(app, exitCode);
  AddRemove(app, exitCode);
  AddSet(app, exitCode);
  AddTimeScale(app, exitCode);
  AddSave(app, exitCode);
  AddLoad(app, exitCode);
  AddDiff(app, exitCode);
  AddFollow(app, exitCode);
  AddShow(app, exitCode);
  AddStats(app, exitCode);
  AddTop(app, exitCode);
  AddWrite(app, exitCode);
  AddDoctor(app, exitCode);
}

}  // namespace

int main(int argc, char** argv) try {
  CLI::App app("Shows and changes the shared log levels, and reads the logs.", "twlogctl");
  app.require_subcommand(1);
  app.footer("Exit codes: 0 done; 1 something is wrong, or nothing was found; 2 wrong usage.");
  AddVersionFlag(&app);
  int exitCode = kExitDone;
  AddCommands(&app, &exitCode);
  AddCompletion(&app, Words());
  if (const auto ended = ParseArguments(&app, argc, argv)) return *ended;
  if (fflush(stdout) != 0 || ferror(stdout) != 0) {
    Complain("cannot write the output");
    return kExitWrong;
  }
  return exitCode;
} catch (const std::exception& error) {  // memory ran out, or the like
  Complain(error.what());
  return kExitWrong;
}
