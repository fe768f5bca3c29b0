// A program with a DelayTimer on its stack, beside bytes that a larger one would overwrite.
#include <cstdio>
#include <cstring>

#include "tarnwick/utils/utils.h"

int main() {
  struct {
    char before[64];
    DelayTimer timer = DelayTimer(1);
    char after[64];
  } frame;
  std::memset(frame.before, 'b', sizeof(frame.before));
  std::memset(frame.after, 'a', sizeof(frame.after));
  frame.timer.Delay();
  const bool whole = frame.before[63] == 'b' && frame.after[0] == 'a';
  std::puts(whole ? "paced" : "overwritten");
  return whole ? 0 : 1;
}
