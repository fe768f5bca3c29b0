// Keeps passwords, credentials and cookies out of what the tool prints.
#ifndef TARNWICK_TOOLS_TWHTTP_SECRETS_H_
#define TARNWICK_TOOLS_TWHTTP_SECRETS_H_

#include <string>

#include "tools/twhttp/options.h"

// A header line's value: of Authorization only the scheme stays, of cookies nothing.
std::string MaskValue(const Options& options, const std::string& name, const std::string& value);

// A whole request or response, of which only the head is looked at.
std::string MaskHead(const Options& options, const std::string& message);

// Any text: the password and the encoded credentials become ***.
std::string MaskText(const Options& options, const std::string& text);

#endif  // TARNWICK_TOOLS_TWHTTP_SECRETS_H_
