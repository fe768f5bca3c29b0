// The grammar of hostile responses: a head and a body with all that may be wrong about them.
#ifndef TARNWICK_TESTS_ATTACK_RESPONSE_H_
#define TARNWICK_TESTS_ATTACK_RESPONSE_H_

#include <string>

#include "tests/attack/dice.h"

struct Response {
  std::string bytes;        // as it travels
  int status = 0;           // of its status line
  bool clean_head = false;  // every client must understand the head in the same way
  bool clean_body = false;  // and the body, which is `content` without its framing
  bool chunked = false;
  std::string content;
};

// What the body is to look like.
enum class BodyKind { kJson, kXml, kAny };

// A response that is right in all parts.
Response CleanResponse(BodyKind kind, Dice* dice);

// One with mistakes, out of the grammar and by mutations.
Response HostileResponse(BodyKind kind, Dice* dice);

// Parts of it.
std::string CleanBody(BodyKind kind, Dice* dice);
std::string HostileBody(BodyKind kind, Dice* dice);
std::string HostileStatusLine(Dice* dice);
std::string HostileHeaderLine(Dice* dice);
std::string HostileChallenge(Dice* dice);
std::string CleanChallenge(Dice* dice);

// Cuts, flips, doubles, inserts and swaps.
void Mutate(std::string* bytes, Dice* dice);

#endif  // TARNWICK_TESTS_ATTACK_RESPONSE_H_
