// The logins that the soak's server asks for and checks.
#ifndef TARNWICK_TESTS_SOAK_CREDENTIALS_H_
#define TARNWICK_TESTS_SOAK_CREDENTIALS_H_

#include <string>

#include "tests/soak/plan.h"

// The header line that asks for it, with its line end.
std::string ChallengeOf(Login login);

// True when the request's head carries the right login. The response of Digest is computed here on
// its own, without the library.
bool LoginIsRight(Login login, const std::string& head);

#endif  // TARNWICK_TESTS_SOAK_CREDENTIALS_H_
