// A request as it came.
#ifndef TARNWICK_TOOLS_TWCAMSIM_REQUEST_H_
#define TARNWICK_TOOLS_TWCAMSIM_REQUEST_H_

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "tools/common/text.h"

struct Header {
  std::string name;
  std::string value;
};

struct Request {
  std::string method;
  std::string target;  // as on the request line
  std::string path;    // the target up to the "?"
  std::string query;   // and after it
  int version = 11;    // 10: HTTP/1.0
  std::vector<Header> headers;
  std::string head;  // the bytes up to the blank line
  std::string body;

  // What a strict server would refuse in the head; empty when nothing.
  std::string deviation;

  // The value of the first header of that name, in any case; empty when there is none.
  std::string Get(std::string_view name) const;

  // Content-Length, or -1.
  int64_t Length() const;

  bool KeepsAlive() const;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_REQUEST_H_
