// What the command line asks for.
#ifndef TARNWICK_TOOLS_TWHTTP_OPTIONS_H_
#define TARNWICK_TOOLS_TWHTTP_OPTIONS_H_

#include <cstdint>
#include <string>

#include "tarnwick/http/twhttp.h"
#include "tools/twhttp/operations.h"
#include "tools/twhttp/target.h"

struct Options {
  const Operation* operation = nullptr;
  Target target;

  int timeout = 5;
  bool buffered = true;
  bool encode_query = false;
  std::string encode_keep;
  bool basic_first = false;
  HTTP_VERSION version = HTTP_VERSION_NONE;
  std::string cookie;
  unsigned source = 0;  // network byte order
  std::string response_file;
  bool verify_peer = true;
  std::string separators = "?";
  std::string body;
  std::string body_file;  // "-": standard input
  bool has_body = false;

  bool verbose = false;
  bool timings = false;
  bool json = false;
  bool show_secrets = false;
  bool offline = false;
  std::string challenge;
  bool as_curl = false;
  std::string record;
  int repeat = 1;
  double interval = 1;
  double give_up = -1;    // seconds; 0 for never, negative for the usual span
  uint64_t max_body = 0;  // bytes; 0 for no limit
};

// Reads the command line.
// Results: true with `options` filled; false with the program's exit code in `exit_code`, when help
//   or an error was printed.
bool ReadOptions(int argc, char** argv, Options* options, int* exit_code);

#endif  // TARNWICK_TOOLS_TWHTTP_OPTIONS_H_
