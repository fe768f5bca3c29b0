// The strings that are requested, sent, parsed and encoded.
#ifndef TARNWICK_BENCH_TEXTS_H_
#define TARNWICK_BENCH_TEXTS_H_

#include <cstddef>
#include <string>

// A response's head: a status line, thirty header fields, of which the library keeps seven, and the
// empty line.
std::string HeadOf30Lines();

// 60,000 bytes of lines.
std::string Lines();

// An envelope as devices send it, with a CRLF every 30 to 80 bytes.
std::string SoapResponse(size_t size);

// Text as a query's value is: one byte in five is to be escaped.
std::string QueryText(size_t size);

// The response to requests for JSON.
constexpr char kJsonText[] =
    "{\"data\":{\"id\":7,\"name\":\"front door\",\"on\":true},\"success\":true}";

// A SOAP envelope of about that size, on lines of 38 bytes.
std::string Envelope(size_t size);

// The body in chunks of `chunk` bytes, with the last one and the empty line.
std::string Chunked(const std::string& body, size_t chunk);

#endif  // TARNWICK_BENCH_TEXTS_H_
