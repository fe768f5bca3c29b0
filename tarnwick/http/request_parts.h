// What the requests of a client are made of.
#ifndef TARNWICK_HTTP_REQUEST_PARTS_H_
#define TARNWICK_HTTP_REQUEST_PARTS_H_

#include <string>

#include "tarnwick/http/twhttp.h"

namespace tarnwick {

// The strings are the client's own.
struct RequestParts {
  const std::string& host;
  int port;
  const std::string& path;  // without leading "/"
  const std::string& user;
  const std::string& password;
  const std::string& cookie;
  const std::string& authorization;  // a header line without its CRLF
  HTTP_VERSION version;
  bool https;
};

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_REQUEST_PARTS_H_
