// The lines of a response's head (RFC 7230, section 3), as text. Pure functions.
#ifndef TARNWICK_HTTP_HEAD_PARSER_H_
#define TARNWICK_HTTP_HEAD_PARSER_H_

#include <string_view>

#include "tarnwick/http/kept_fields.h"

namespace tarnwick {

enum class StatusLine {
  kParsed,
  kIncomplete,  // no version or no status
  kNotHttp,     // a version other than HTTP/1.0 and HTTP/1.1
};

// Splits `line` at its spaces and stores the second word's leading number in `status`, 0 when it is
// no number. `status` is stored only for kParsed.
StatusLine ParseStatusLine(std::string_view line, int* status);

struct HeaderLine {
  bool hasName = false;
  const KeptField* field = nullptr;  // nullptr when the client does not keep it
  // Of a kept field, whatever follows the one character after the name; may be empty.
  std::string_view value;
};

// Splits a header line.
HeaderLine ParseHeaderLine(std::string_view line);

// The cookie of a Set-Cookie value: up to its first ";", which stays, without spaces at the ends.
// Without a ";" there is no cookie.
std::string_view ParseCookie(std::string_view value);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_HEAD_PARSER_H_
