// The requests as the library writes them, for the floors: the same bytes on the wire.
#ifndef TARNWICK_BENCH_REQUEST_TEXT_H_
#define TARNWICK_BENCH_REQUEST_TEXT_H_

#include <string>

#include "bench/exchange.h"

std::string RequestText(const Exchange& exchange);

// As RequestText, with the credentials for the server's challenge.
std::string AuthorizedText(const Exchange& exchange);

#endif  // TARNWICK_BENCH_REQUEST_TEXT_H_
