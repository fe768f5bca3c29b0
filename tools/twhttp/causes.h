// The finders of causes, and what they share.
#ifndef TARNWICK_TOOLS_TWHTTP_CAUSES_H_
#define TARNWICK_TOOLS_TWHTTP_CAUSES_H_

#include <string>
#include <vector>

#include "tools/twhttp/failure.h"

using Causes = std::vector<std::string>;

std::string Lower(std::string text);
bool Has(const std::string& text, const char* word);

// The last exchange, or an empty one.
const Exchange& LastOf(const Evidence& evidence);

Causes OfLoginRefused(const Evidence& evidence);
Causes OfLoginWanted(const Evidence& evidence);

// Behind the usual causes: peers that renew their nonces with each refusal are nothing unusual.
Causes AfterLoginRefused(const Evidence& evidence);

#endif  // TARNWICK_TOOLS_TWHTTP_CAUSES_H_
