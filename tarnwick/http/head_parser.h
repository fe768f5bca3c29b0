// The lines of a response's head (RFC 7230, section 3), as text. Pure functions.
#ifndef TARNWICK_HTTP_HEAD_PARSER_H_
#define TARNWICK_HTTP_HEAD_PARSER_H_

#include <string>
#include <string_view>

enum class StatusLine {
  kParsed,
  kIncomplete,  // no version or no status
  kNotHttp,     // a version other than HTTP/1.0 and HTTP/1.1
};

// Splits `line` at its spaces and stores the second word's leading number in `status`, 0 when it is
// no number. `status` is stored only for kParsed.
StatusLine ParseStatusLine(std::string_view line, int* status);

// The headers that the client keeps.
enum class Header {
  kContentType,
  kContentLength,
  kContentRange,
  kSetCookie,
  kAuthenticate,
  kTransferEncoding,
  kOther,
};

struct HeaderLine {
  bool hasName = false;
  Header header = Header::kOther;
  std::string_view value;  // whatever follows the one character behind the name; may be empty
};

// Splits a header line. A name that begins with a known one counts as that: devices append to them.
HeaderLine ParseHeaderLine(std::string_view line);

// The cookie of a Set-Cookie value: up to its first ";", which stays, without spaces at the ends.
// Without a ";" there is no cookie.
std::string CookieOf(std::string_view value);

#endif  // TARNWICK_HTTP_HEAD_PARSER_H_
