// A response, first as what it says and then as the steps that put it on the wire.
#ifndef TARNWICK_TOOLS_TWCAMSIM_RESPONSE_H_
#define TARNWICK_TOOLS_TWCAMSIM_RESPONSE_H_

#include <chrono>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "tools/twcamsim/request.h"

enum class Part {
  kInterim,
  kWait,  // no bytes
  kStatusLine,
  kHeader,
  kBlank,
  kBody,
  kChunkSize,
  kChunkEnd,
  kLastChunk
};

enum class Action {
  kSend,
  kPause,  // for `pause`
  kStall,  // until the peer leaves
  kClose,
  kReset,
};

struct Step {
  Action action = Action::kSend;
  Part part = Part::kBody;
  std::string bytes;
  std::chrono::milliseconds pause{0};
};

using Steps = std::vector<Step>;

struct Response {
  int status = 200;
  std::string reason;  // empty: the usual one of the status
  std::vector<Header> headers;
  std::string body;
  bool chunked = false;
  size_t chunk_size = 4096;
  bool close = false;

  // An endless body: makes the next piece; false after the last. The body is then not used.
  std::function<bool(std::string* piece)> more;
  std::chrono::milliseconds interval{0};

  // Bytes to send as they are, instead of all of the above.
  bool raw = false;
  Steps steps;

  void Set(std::string_view name, const std::string& value);
  std::string Get(std::string_view name) const;
};

// A response with a body of that type.
Response MakeResponse(int status, const std::string& type, const std::string& body);

// The steps of `response` for `request`: one for the status line, one for each header, one for the
// blank line, and the body whole or by chunks. Without a body for HEAD and for 1xx, 204 and 304.
Steps RenderResponse(const Response& response, const Request& request);

// All bytes of the steps that send.
std::string BytesOf(const Steps& steps);

// Replaces the header of that name, or adds it in front of the blank line.
void SetHeader(Steps* steps, std::string_view name, const std::string& value);

void RemoveHeader(Steps* steps, std::string_view name);

// The index of the first step of `part`; steps.size() without such a step.
size_t FindPart(const Steps& steps, Part part);

#endif  // TARNWICK_TOOLS_TWCAMSIM_RESPONSE_H_
