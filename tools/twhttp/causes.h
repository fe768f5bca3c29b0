// What a failure's evidence points at.
#ifndef TARNWICK_TOOLS_TWHTTP_CAUSES_H_
#define TARNWICK_TOOLS_TWHTTP_CAUSES_H_

#include <string>
#include <vector>

#include "tools/twhttp/failure.h"

using Causes = std::vector<std::string>;

// What this failure's own evidence points at, before the usual causes of its class; and the command
// that looks further.
Causes SpecialCauses(const Evidence& evidence, FailureClass id);
Causes FurtherCauses(const Evidence& evidence, FailureClass id);  // after them
const char* NextCommand(const Evidence& evidence, FailureClass id);

// Of causes_credentials.cpp.
Causes OfLoginRefused(const Evidence& evidence);
Causes OfLoginWanted(const Evidence& evidence);

// After the usual causes, because many peers send a new nonce with each refusal.
Causes AfterLoginRefused(const Evidence& evidence);

#endif  // TARNWICK_TOOLS_TWHTTP_CAUSES_H_
