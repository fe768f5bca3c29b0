#include "tools/twlogctl/log_options.h"

#include <CLI/CLI.hpp>

#include "tools/common/names.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/report.h"

namespace {

[[noreturn]] void Refuse(const char* option, const std::string& reason) {
  throw CLI::ValidationError(option, reason);
}

std::optional<Moment> ToMoment(const char* option, const std::string& typed, Moment now,
                               Direction direction) {
  if (typed.empty()) return std::nullopt;
  const std::optional<Moment> moment = ParseMoment(typed, now, direction);
  if (!moment) {
    Refuse(option,
           "\"" + typed + "\" is neither a time (14:00, 2026-03-05 14:00) nor a span (10m)");
  }
  return moment;
}

void TakeNames(const LogOptions& options, LogFilter* filter) {
  for (const std::string& typed : options.categories) {
    const std::optional<LOG_CATEG> category = ParseCategory(typed);
    if (!category)
      Refuse("--category", "unknown category \"" + typed + "\"" + DidYouMeanCategory(typed));
    filter->categories.push_back(Enum2String(*category));
  }
  if (options.level.empty()) return;
  filter->level = ParseLevel(options.level);
  if (!filter->level)
    Refuse("--level", "unknown level \"" + options.level + "\"" + DidYouMeanLevel(options.level));
}

void TakeText(const LogOptions& options, LogFilter* filter) {
  if (!options.regex) {
    filter->text = options.text;
    return;
  }
  std::string reason;
  filter->pattern = TextPattern::Compile(options.text, &reason);
  if (filter->pattern == nullptr) Refuse("--grep", reason);
}

}  // namespace

std::string IsWholeNumber(const std::string& typed) {
  const bool digits = typed.find_first_not_of("0123456789") == std::string::npos;
  if (digits && !typed.empty() && typed.size() < 10) return "";
  return "\"" + typed + "\" is no whole number";
}

void AddSourceOptions(CLI::App* app, LogOptions* options) {
  auto* notification = app->add_flag("--notification", options->notification,
                                     "Read the notification log instead of the main log.");
  app->add_option("--file", options->file, "Read this file, for example a copied log.")
      ->type_name("PATH")
      ->excludes(notification);
}

void AddJsonOption(CLI::App* app, LogOptions* options) {
  app->add_flag("--json", options->json, "Print one JSON object a line.");
}

void AddMarkOption(CLI::App* app, LogOptions* options) {
  app->add_flag("--mark", options->mark,
                "Mark doubtful messages and further lines without a terminal, too.");
}

void AddTimeOptions(CLI::App* app, LogOptions* options) {
  app->add_option("--since", options->since,
                  "Take messages from this time on: 14:00, \"2026-03-05 14:00\", or 10m ago.")
      ->type_name("TIME");
  app->add_option("--until", options->until,
                  "Take messages before this time, given as for --since.")
      ->type_name("TIME");
}

void AddFilterOptions(CLI::App* app, LogOptions* options) {
  app->add_option("-c,--category", options->categories,
                  "Take messages of these categories, names or numbers with commas between them.")
      ->delimiter(',')
      ->allow_extra_args(false)
      ->type_name("CATEGORY");
  app->add_option("-l,--level", options->level, "Take messages of this level and the more severe.")
      ->type_name("LEVEL");
  app->add_option("-p,--pid", options->pids, "Take messages of these processes.")
      ->delimiter(',')
      ->allow_extra_args(false)
      ->check(IsWholeNumber)
      ->type_name("PID");
  auto* text =
      app->add_option("-g,--grep", options->text,
                      "Take messages that contain this text, prefix and all lines included.")
          ->type_name("TEXT");
  app->add_flag("--regex", options->regex,
                "Take the text of --grep for an extended regular expression.")
      ->needs(text);
}

std::string LogPath(const LogOptions& options) {
  if (!options.file.empty()) return options.file;
  return options.notification ? kNotificationLogPath : kMainLogPath;
}

std::string FollowedPath(const LogOptions& options) {
  if (options.file == "-") Refuse("--file", "standard input cannot be followed");
  return LogPath(options);
}

LogFilter MakeFilter(const LogOptions& options, Moment now, Direction until) {
  LogFilter filter;
  TakeNames(options, &filter);
  TakeText(options, &filter);
  filter.pids = options.pids;
  filter.since = ToMoment("--since", options.since, now, Direction::kBack);
  filter.until = ToMoment("--until", options.until, now, until);
  if (filter.since && filter.until && *filter.until <= *filter.since) {
    Refuse("--until", "it is not later than --since");
  }
  return filter;
}
