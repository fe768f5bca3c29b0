// The command line.
#ifndef TARNWICK_TOOLS_TWCAMSIM_ARGUMENTS_H_
#define TARNWICK_TOOLS_TWCAMSIM_ARGUMENTS_H_

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "tools/twcamsim/endpoint.h"

struct Arguments {
  std::vector<std::string> endpoints;
  std::vector<std::string> faults;
  std::string replay;
  std::string listen = "127.0.0.1";
  std::string dir;
  std::string journal;
  std::string access;
  std::optional<uint32_t> seed;
  std::chrono::milliseconds idle{60000};
  std::chrono::milliseconds hold{3600000};
  std::chrono::milliseconds run_for{0};
  bool json = false;
  bool list_faults = false;
  bool list_profiles = false;
  bool list_logins = false;
};

// Parses the command line; --help, --version and --completion print and end.
// Results: nothing when the program is to go on, else its exit status.
std::optional<int> ParseArguments(int argc, char** argv, Arguments* arguments);

// The endpoints that the arguments ask for, with their faults, addresses and names of their own.
// Results: false with a sentence in `error`.
bool MakeEndpoints(const Arguments& arguments, std::vector<std::unique_ptr<Endpoint>>* endpoints,
                   std::string* error);

#endif  // TARNWICK_TOOLS_TWCAMSIM_ARGUMENTS_H_
