#include "bench/options.h"

#include <getopt.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "bench/contender.h"

namespace {

// An option that chooses the mode has it as its value.
constexpr struct option kOptions[] = {
    {"list", no_argument, nullptr, Options::kList},
    {"list-counted", no_argument, nullptr, Options::kListCounted},
    {"one", required_argument, nullptr, Options::kMeasureOne},
    {"counted", required_argument, nullptr, Options::kCountOne},
    {"contender", required_argument, nullptr, 'c'},
    {"count", required_argument, nullptr, 'n'},
    {"rounds", required_argument, nullptr, 'r'},
    {"milliseconds", required_argument, nullptr, 'm'},
    {"seconds", required_argument, nullptr, 's'},
    {nullptr, 0, nullptr, 0},
};

bool Take(int option, const char* value, Options* options) {
  switch (option) {
    case 'c':
      options->contender = value;
      return true;
    case 'n':
      options->count = std::atoi(value);
      return options->count > 0;
    case 'r':
      options->rounds = std::atoi(value);
      return options->rounds > 0;
    case 'm':
      options->roundSeconds = std::atof(value) / 1000;
      return options->roundSeconds > 0;
    case 's':
      options->seconds = std::atoi(value);
      return options->seconds > 0;
    case '?':
      return false;
    default:
      options->mode = static_cast<Options::Mode>(option);
      options->work = value;
      return true;
  }
}

bool IsKnown(const std::string& name) {
  const auto& works = AllWorks();
  const bool known = std::any_of(works.begin(), works.end(), [&name](const Work& work) {
    return name == work.section || name == work.name;
  });
  if (!known) std::fprintf(stderr, "tarnwick_bench: no section or work '%s'\n", name.c_str());
  return known;
}

void PrintSections() {
  std::fputs("sections:", stderr);
  const char* last = "";
  for (const Work& work : AllWorks()) {
    if (std::strcmp(work.section, last) != 0) std::fprintf(stderr, " %s", work.section);
    last = work.section;
  }
  std::fputs("\n", stderr);
}

bool TakeAll(int argc, char** argv, Options* options) {
  for (int option; (option = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
    if (!Take(option, optarg, options)) return false;
  }
  options->selected.assign(argv + optind, argv + argc);
  const auto& selected = options->selected;
  if (options->work != nullptr && (options->contender == nullptr || options->count == 0)) {
    return false;
  }
  return std::all_of(selected.begin(), selected.end(), IsKnown);
}

}  // namespace

bool ParseOptions(int argc, char** argv, Options* options) {
  if (TakeAll(argc, argv, options)) return true;
  std::fputs(
      "usage: tarnwick_bench [--rounds N] [--milliseconds N] [--seconds N] [SECTION|WORK...]\n"
      "       tarnwick_bench --list | --list-counted [SECTION|WORK...]\n"
      "       tarnwick_bench --counted WORK --contender NAME --count N\n"
      "--rounds        how often each contender of a work is measured (default: 25)\n"
      "--milliseconds  how long each measurement takes (default: 50)\n"
      "--seconds       when the rounds of a work end early, but for three (default: 60)\n"
      "--list          the works by section, and who does them\n"
      "--list-counted  section, work, contender and the operations of a counted run\n"
      "--counted       does the work of one contender N times, for bench/count\n",
      stderr);
  PrintSections();
  return false;
}
