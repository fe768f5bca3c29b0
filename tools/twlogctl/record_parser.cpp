// The arguments of the sub-commands that deal with the shared record.
#include <CLI/CLI.hpp>
#include <memory>

#include "tools/common/units.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/create_remove.h"
#include "tools/twlogctl/set_levels.h"
#include "tools/twlogctl/settings_commands.h"
#include "tools/twlogctl/status.h"

namespace {

struct Flags {
  bool json = false;
  bool all = false;
  bool yes = false;
};

void AddJson(CLI::App* command, bool* json) {
  command->add_flag("--json", *json, "Print one JSON object a line.");
}

std::chrono::milliseconds SpanOf(const std::string& text) {
  const auto span = ParseSpan(text);
  if (!span || span->count() == 0) {
    throw CLI::ValidationError("--for", "\"" + text + "\" is no span such as 90s, 10m or 1.5h");
  }
  return *span;
}

mode_t ModeOf(const std::string& text) {
  const auto mode = ParseRecordMode(text);
  if (!mode) {
    throw CLI::ValidationError(
        "--mode", "\"" + text + "\" is no octal mode that lets the owner read and write");
  }
  return *mode;
}

}  // namespace

void AddStatus(CLI::App* app, int* exit_code) {
  auto flags = std::make_shared<Flags>();
  CLI::App* const command = app->add_subcommand(
      "status", "Show the shared record of levels, and the levels that are not notice.");
  command->add_flag("-a,--all", flags->all, "Show the levels of all categories.");
  AddJson(command, &flags->json);
  command->callback([=] { *exit_code = ShowStatus(flags->all, flags->json); });
}

void AddCreate(CLI::App* app, int* exit_code) {
  auto options = std::make_shared<CreateOptions>();
  CLI::App* const command = app->add_subcommand(
      "create", "Make the shared record, with the levels of the settings file.");
  command
      ->add_option_function<std::string>(
          "-m,--mode", [=](const std::string& text) { options->mode = ModeOf(text); },
          "Give the record this octal mode; without it, 0660.")
      ->type_name("MODE");
  command
      ->add_option_function<std::string>(
          "-g,--group", [=](const std::string& text) { options->group = text; },
          "Give the record to this group, by name or number.")
      ->type_name("GROUP");
  AddJson(command, &options->json);
  command->footer(
      "A daemon attaches the record when it loads the library, and not later:\n"
      "daemons that run already must be started again.");
  command->callback([=] { *exit_code = CreateRecord(*options); });
}

void AddRemove(CLI::App* app, int* exit_code) {
  auto flags = std::make_shared<Flags>();
  CLI::App* const command = app->add_subcommand(
      "remove", "Remove the shared record; ask first while processes are attached.");
  command->add_flag("-y,--yes", flags->yes, "Do not ask, and remove it from under its users.");
  AddJson(command, &flags->json);
  command->callback([=] { *exit_code = RemoveRecord(flags->yes, flags->json); });
}

void AddSet(CLI::App* app, int* exit_code) {
  auto options = std::make_shared<SetOptions>();
  CLI::App* const command =
      app->add_subcommand("set", "Change levels, for all running processes at once.");
  command
      ->add_option(
          "levels", options->assignments,
          "Categories and their level: http=debug socket,utils=debug2 all=notice. Names or "
          "numbers; \"all\" is every category that is not named by itself.")
      ->required();
  command
      ->add_option_function<std::string>(
          "-f,--for", [=](const std::string& text) { options->span = SpanOf(text); },
          "Put the old levels back after this span (90s, 10m, 1.5h), and wait for it.")
      ->type_name("SPAN");
  AddJson(command, &options->json);
  command->footer(
      "With --for, a second process keeps the old levels. It puts them back when the\n"
      "span is over, and at once when this one is gone, by Ctrl-C or even by SIGKILL.\n"
      "A level that somebody else has changed meanwhile stays as they left it.");
  command->callback([=] { *exit_code = SetLevels(*options); });
}

void AddTimeScale(CLI::App* app, int* exit_code) {
  auto flags = std::make_shared<Flags>();
  auto state = std::make_shared<std::string>();
  CLI::App* const command = app->add_subcommand(
      "timescale", "Switch the milliseconds in the time stamps of log lines on or off.");
  command->add_option("state", *state, "\"on\" or \"off\".")
      ->required()
      ->check(CLI::IsMember({"on", "off"}));
  AddJson(command, &flags->json);
  command->callback([=] { *exit_code = SetTimeScale(*state == "on", flags->json); });
}

void AddSave(CLI::App* app, int* exit_code) {
  auto flags = std::make_shared<Flags>();
  CLI::App* const command =
      app->add_subcommand("save", "Write the record's levels into the settings file.");
  AddJson(command, &flags->json);
  command->callback([=] { *exit_code = SaveRecord(flags->json); });
}

void AddLoad(CLI::App* app, int* exit_code) {
  auto flags = std::make_shared<Flags>();
  CLI::App* const command = app->add_subcommand(
      "load", "Set the record's levels from the settings file, unless it is broken.");
  AddJson(command, &flags->json);
  command->callback([=] { *exit_code = LoadRecord(flags->json); });
}

void AddDiff(CLI::App* app, int* exit_code) {
  auto flags = std::make_shared<Flags>();
  CLI::App* const command = app->add_subcommand(
      "diff", "Show where the record and the settings file differ; exit with 1 when they do.");
  AddJson(command, &flags->json);
  command->callback([=] { *exit_code = DiffRecord(flags->json); });
}
