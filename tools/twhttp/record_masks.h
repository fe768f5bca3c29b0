// Keeps secrets out of a recording, which is made to be sent to others.
#ifndef TARNWICK_TOOLS_TWHTTP_RECORD_MASKS_H_
#define TARNWICK_TOOLS_TWHTTP_RECORD_MASKS_H_

#include <string>

#include "tools/twhttp/options.h"

// A whole request: credentials, cookies, those in a URL and the values of secret parameters (those
// of the query, and of a body of form fields) become ***, unless secrets are to be shown.
std::string MaskRequest(const Options& options, const std::string& request);

// A whole response: the same in its heads, by as many asterisks, because the sizes of its pieces
// and its Content-Length stay.
std::string MaskResponse(const Options& options, const std::string& response);

#endif  // TARNWICK_TOOLS_TWHTTP_RECORD_MASKS_H_
