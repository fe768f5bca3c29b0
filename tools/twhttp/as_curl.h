// The curl command that comes nearest to an operation.
#ifndef TARNWICK_TOOLS_TWHTTP_AS_CURL_H_
#define TARNWICK_TOOLS_TWHTTP_AS_CURL_H_

#include <string>

#include "tools/twhttp/options.h"

// The command on one line, its words quoted for a shell; the password is *** unless secrets are to
// be shown.
std::string AsCurl(const Options& options);

#endif  // TARNWICK_TOOLS_TWHTTP_AS_CURL_H_
