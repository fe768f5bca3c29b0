// The arguments of "write" and "doctor".
#include <CLI/CLI.hpp>
#include <memory>

#include "tools/common/names.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/report.h"
#include "tools/twlogctl/write_line.h"

namespace {

LOG_CATEG CategoryOf(const std::string& text) {
  const auto categ = ParseCategory(text);
  if (!categ) {
    throw CLI::ValidationError("--category",
                               "unknown category \"" + text + "\"" + DidYouMeanCategory(text));
  }
  return *categ;
}

LOG_LEVEL LevelOf(const std::string& text) {
  const auto level = ParseLevel(text);
  if (!level) {
    throw CLI::ValidationError("--level", "unknown level \"" + text + "\"" + DidYouMeanLevel(text));
  }
  return *level;
}

}  // namespace

void AddWrite(CLI::App* app, int* exit_code) {
  auto options = std::make_shared<WriteOptions>();
  CLI::App* const command =
      app->add_subcommand("write", "Write a line into the log, as a daemon does.");
  command->add_option("text", options->text, "The line; \"-\" takes the lines of standard input.")
      ->required();
  command
      ->add_option_function<std::string>(
          "-c,--category", [=](const std::string& text) { options->categ = CategoryOf(text); },
          "The line's category, by name or number; \"utils\" without it.")
      ->type_name("CATEGORY");
  command
      ->add_option_function<std::string>(
          "-l,--level", [=](const std::string& text) { options->level = LevelOf(text); },
          "The line's level, by name or number; \"notice\" without it.")
      ->type_name("LEVEL");
  command
      ->add_option("-s,--source", options->source,
                   "What the line names as its source; \"twlogctl\" without it.")
      ->type_name("NAME");
  command->add_flag_callback(
      "--notification", [=] { options->type = LOG_TYPE_NOTIFICATION; },
      "Write into the notification log.");
  command->add_flag("--force", options->force, "Write although the category's level is off.");
  command->add_flag("--json", options->json, "Print one JSON object a line.");
  command->footer("A line whose level is off is not written: exit code 1.");
  command->callback([=] { *exit_code = WriteText(*options); });
}

void AddDoctor(CLI::App* app, int* exit_code) {
  auto json = std::make_shared<bool>(false);
  CLI::App* const command = app->add_subcommand(
      "doctor", "Look for what stops logging, and tell a fix for each finding.");
  command->add_flag("--json", *json, "Print one JSON object a line.");
  command->footer("Exit code 1 when something is wrong. It watches the logs' locks for a second.");
  command->callback([=] { *exit_code = RunDoctor(*json); });
}
