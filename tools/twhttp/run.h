// Runs one operation of the library.
#ifndef TARNWICK_TOOLS_TWHTTP_RUN_H_
#define TARNWICK_TOOLS_TWHTTP_RUN_H_

#include <cstdint>
#include <functional>
#include <string>

#include "tools/twhttp/options.h"

// How what came was to be understood, beyond HTTP.
enum class Content { kFine, kNotXml, kNoXml, kNotJson, kNotSuccess, kEmpty };

struct Outcome {
  int result = 0;            // of the library's call
  int last = 0;              // of the last response, as CheckResponse tells it
  bool good = false;         // the call and the status say success
  int status = 0;            // as the client tells it
  bool read_failed = false;  // the body's reading failed after a good head
  Content content = Content::kFine;
  std::string content_error;  // the parser's words
  uint64_t body_bytes = 0;    // handed to the writer
  bool output_failed = false;
};

// True when `text` is a well-formed document, which the XML requests have to be given.
bool IsXml(const std::string& text);

// Feature the body piece by piece. Results: false when no more is wanted or possible.
using BodyWriter = std::function<bool(const std::string& piece)>;

// Runs `options.operation`. `body` is what to send; an upload reads its file itself.
Outcome RunOperation(const Options& options, const std::string& body, const BodyWriter& write);

#endif  // TARNWICK_TOOLS_TWHTTP_RUN_H_
