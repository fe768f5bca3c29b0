// Which rule of the library made a line of a request.
#ifndef TARNWICK_TOOLS_TWHTTP_RULES_H_
#define TARNWICK_TOOLS_TWHTTP_RULES_H_

#include <string>

#include "tools/twhttp/operations.h"

// The rule for the request line, for `name` empty, or for the header of that name; empty for
// a line that this operation never writes.
std::string RuleOf(const Operation& operation, const std::string& name);

#endif  // TARNWICK_TOOLS_TWHTTP_RULES_H_
