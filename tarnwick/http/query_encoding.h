// Percent-encoding of a request path's query.
#ifndef TARNWICK_HTTP_QUERY_ENCODING_H_
#define TARNWICK_HTTP_QUERY_ENCODING_H_

#include <string>

namespace tarnwick {

// `path` with the values of its query percent-encoded, except the characters of `keep`. What is
// before the "?", the names, the separators and parts without "=" stay as they are.
//
// A zero byte in a value is encoded like any other byte. Nothing follows the first part that has no
// "=", or whose value begins, after the path's first zero byte; of a part without "=" only what
// stands before that byte is copied.
std::string EncodeQueryValues(const std::string& path, const std::string& keep);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_QUERY_ENCODING_H_
