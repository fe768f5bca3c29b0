#include "tarnwick/version.h"

#define TARNWICK_TEXT_OF(number) #number
#define TARNWICK_DOTTED(major, minor, patch) \
  TARNWICK_TEXT_OF(major) "." TARNWICK_TEXT_OF(minor) "." TARNWICK_TEXT_OF(patch)

int TWVersionNumber() {
  return TARNWICK_VERSION_NUMBER;
}

const char* TWVersion() {
  return TARNWICK_DOTTED(TARNWICK_VERSION_MAJOR, TARNWICK_VERSION_MINOR, TARNWICK_VERSION_PATCH);
}
