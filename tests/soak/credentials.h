// The credentials that the soak's server asks for and checks.
#ifndef TARNWICK_TESTS_SOAK_CREDENTIALS_H_
#define TARNWICK_TESTS_SOAK_CREDENTIALS_H_

#include <string>

#include "tests/soak/plan.h"

// The header field that asks for it, with its CRLF.
std::string ChallengeOf(Scheme scheme);

// True when the request's head carries the right credentials. The response of Digest is computed
// here on its own, without the library.
bool CredentialsAreRight(Scheme scheme, const std::string& head);

#endif  // TARNWICK_TESTS_SOAK_CREDENTIALS_H_
