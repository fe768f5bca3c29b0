#include "bench/compare/options.h"

#include <getopt.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>

#include "bench/compare/contender.h"

namespace {

constexpr struct option kOptions[] = {
    {"list", no_argument, nullptr, 'l'},
    {"rounds", required_argument, nullptr, 'r'},
    {"milliseconds", required_argument, nullptr, 'm'},
    {"seconds", required_argument, nullptr, 's'},
    {"one", required_argument, nullptr, 'o'},
    {"contender", required_argument, nullptr, 'c'},
    {"count", required_argument, nullptr, 'n'},
    {nullptr, 0, nullptr, 0},
};

bool Take(int option, const char* value, Options* options) {
  switch (option) {
    case 'l':
      options->list = true;
      return true;
    case 'r':
      options->rounds = std::atoi(value);
      return options->rounds > 0;
    case 'm':
      options->roundSeconds = std::atof(value) / 1000;
      return options->roundSeconds > 0;
    case 's':
      options->seconds = std::atoi(value);
      return options->seconds > 0;
    case 'o':
      options->work = value;
      return true;
    case 'c':
      options->contender = value;
      return true;
    case 'n':
      options->count = std::atoi(value);
      return options->count > 0;
    default:
      return false;
  }
}

bool IsKnown(const std::string& name) {
  const auto& works = AllWorks();
  return std::any_of(works.begin(), works.end(), [&name](const Work& work) {
    return name == work.section || name == work.name;
  });
}

bool TakeAll(int argc, char** argv, Options* options) {
  for (int option; (option = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
    if (!Take(option, optarg, options)) return false;
  }
  options->selected.assign(argv + optind, argv + argc);
  const auto& selected = options->selected;
  const bool one =
      options->work == nullptr || (options->contender != nullptr && options->count > 0);
  return one && std::all_of(selected.begin(), selected.end(), IsKnown);
}

}  // namespace

bool ParseOptions(int argc, char** argv, Options* options) {
  if (TakeAll(argc, argv, options)) return true;
  std::fputs(
      "usage: tarnwick_compare [--list] [--rounds N] [--milliseconds N] [--seconds N]\n"
      "                        [SECTION|WORK...]\n"
      "--list          the works by section, and who does them\n"
      "--rounds        how often each contender of a work is measured (default: 25)\n"
      "--milliseconds  how long each measurement takes (default: 50)\n"
      "--seconds       when the rounds of a work end early, but for three (default: 60)\n",
      stderr);
  return false;
}
