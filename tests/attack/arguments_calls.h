// The public functions, and how each is called with hostile arguments.
#ifndef TARNWICK_TESTS_ATTACK_ARGUMENTS_CALLS_H_
#define TARNWICK_TESTS_ATTACK_ARGUMENTS_CALLS_H_

#include <string>
#include <vector>

#include "tests/attack/arguments_ground.h"

struct PublicCall {
  // The qualified name as the linker's demangler writes it, without arguments. A function with
  // several forms has a row for each.
  const char* name;
  void (*call)(Ground& ground, Draw& draw);
};

// One table a header.
std::vector<PublicCall> LogCalls();
std::vector<PublicCall> UtilsCalls();
std::vector<PublicCall> SettingsCalls();  // qlibcfile.h, twrequestscope.h, version.h
std::vector<PublicCall> SocketCalls();    // twsocket.h and sslsocket.h
std::vector<PublicCall> ClientCalls();    // twhttp.h's client: its object and what it tells
std::vector<PublicCall> RequestCalls();   // twhttp.h's requests, one-call functions, twcurl.h

std::vector<PublicCall> AllCalls();

// What differs between `calls` and the functions of the Debian symbols file at `path`: one line per
// name that is missing or is called in fewer forms than the library has. Inline functions of the
// headers are no symbols; the table may have them besides.
std::vector<std::string> MissingCalls(const std::vector<PublicCall>& calls,
                                      const std::string& path);

#endif  // TARNWICK_TESTS_ATTACK_ARGUMENTS_CALLS_H_
