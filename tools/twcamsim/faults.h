// The faults that an endpoint can have: a table of names, arguments, meanings and hooks.
#ifndef TARNWICK_TOOLS_TWCAMSIM_FAULTS_H_
#define TARNWICK_TOOLS_TWCAMSIM_FAULTS_H_

#include <cstdint>
#include <string>
#include <vector>

#include "tools/twcamsim/authenticator.h"
#include "tools/twcamsim/behaviour.h"
#include "tools/twcamsim/random.h"
#include "tools/twcamsim/request.h"
#include "tools/twcamsim/response.h"

// One argument of a fault.
struct ArgumentRule {
  const char* name;                     // "BYTES", "MS": the unit
  const char* default_value = nullptr;  // what it is when it is left out; nullptr: it is required
  int64_t least = 0;
  int64_t most = 0;  // least == most: a text
};

struct FaultArgument {
  std::string text;
  int64_t number = 0;
};

// What a hook may look at.
struct FaultContext {
  const std::vector<FaultArgument>& arguments;
  const Request* request;  // nullptr before there is one
  Random* random;

  int64_t Number(size_t index) const { return arguments[index].number; }
  const std::string& Text(size_t index) const { return arguments[index].text; }
};

// Where a fault takes hold; a fault has one hook or several.
struct FaultHooks {
  void (*behaviour)(Behaviour*, const FaultContext&) = nullptr;
  void (*authentication)(AuthenticationStyle*, const FaultContext&) = nullptr;
  // The response itself; challenges are left alone.
  void (*response)(Response*, const FaultContext&) = nullptr;
  // Every response on its way, challenges as well.
  void (*steps)(Steps*, const FaultContext&) = nullptr;
};

struct FaultType {
  const char* name;
  const char* group;
  std::vector<ArgumentRule> rules;
  const char* meaning;
  FaultHooks hooks;
  bool needs_tls = false;
};

struct Fault {
  const FaultType* type = nullptr;
  std::vector<FaultArgument> arguments;
  std::string text;  // as it was asked for
};

// The whole table.
const std::vector<FaultType>& FaultTypes();

// "[BYTES[,MS]]" from the rules; what may be left out is in brackets.
std::string ArgumentsText(const FaultType& type);

// A fault from "NAME", "NAME=ARG" or "NAME=ARG,ARG"; `separator` stands between the arguments, and
// `assign` after the name.
// Results: false with a sentence in `error`, which names the nearest faults for an unknown one.
bool ParseFault(const std::string& text, char assign, char separator, Fault* fault,
                std::string* error);

// The parts of the table, each in a file of its own.
std::vector<FaultType> ConnectionFaults();
std::vector<FaultType> TlsFaults();
std::vector<FaultType> TimingFaults();
std::vector<FaultType> LengthFaults();
std::vector<FaultType> ChunkFaults();
std::vector<FaultType> HeadFaults();
std::vector<FaultType> AuthenticationFaults();
std::vector<FaultType> BodyFaults();

#endif  // TARNWICK_TOOLS_TWCAMSIM_FAULTS_H_
