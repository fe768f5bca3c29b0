// What the works in memory are done with.
#ifndef TARNWICK_BENCH_COMPARE_TEXTS_H_
#define TARNWICK_BENCH_COMPARE_TEXTS_H_

#include <cstddef>
#include <string>

// A response's head: a status line, thirty header lines, of which the library keeps seven, and the
// empty line.
std::string HeadOf30Lines();

// 60,000 bytes of lines.
std::string Lines();

// An envelope as devices send it, with a line end every 30 to 80 bytes.
std::string SoapReply(size_t size);

// Text as a query's value is: one byte in five is to be escaped.
std::string QueryText(size_t size);

// The text percent-encoded by one plain pass with a table: what all encoders must come to.
std::string UrlEncoded(const std::string& text);

#endif  // TARNWICK_BENCH_COMPARE_TEXTS_H_
