// The beginning of a line is whole whatever the lengths of its names: of each length around those
// of the writer's own buffers, and in each combination.
#include <gtest/gtest.h>
#include <unistd.h>

#include <climits>
#include <string>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

// Where the line's own names begin: after the time, the process and the tags.
std::string WithoutTime(const std::string& text) {
  constexpr size_t kTimeLength = sizeof("Mar  5 14:03:09");
  return text.size() < kTimeLength ? text : text.substr(kTimeLength);
}

void ExpectWhole(size_t tag, size_t source, size_t function, int line) {
  unlink(kMainLog);
  const std::string categ(tag, 'c');
  const std::string file(source, 's');
  const std::string func(function, 'f');
  TWPrintf(LOG_TYPE_MAIN, categ.c_str(), "l", ("dir/" + file).c_str(), line, func.c_str(), "m\n");
  const std::string tags = ("[" + categ + "][l]").substr(0, 127);
  ASSERT_EQ(WithoutTime(ReadFile(kMainLog)), "[" + std::to_string(getpid()) + "]" + tags + " " +
                                                 file + ":" + std::to_string(line) + ":" + func +
                                                 "(): m\n")
      << tag << " " << source << " " << function;
}

TEST(PrefixLengths, ASourceNameOfAnyLengthIsWhole) {
  for (size_t source = 0; source < 700; ++source) {
    ExpectWhole(1, source, 3, INT_MIN);
    if (HasFatalFailure()) return;
  }
}

TEST(PrefixLengths, AFunctionsNameOfAnyLengthIsWhole) {
  for (size_t function = 0; function < 700; ++function) {
    ExpectWhole(200, 20, function, INT_MIN);
    if (HasFatalFailure()) return;
  }
}

TEST(PrefixLengths, LongNamesOfBothAreWhole) {
  for (size_t length = 200; length < 5000; length += 37) {
    ExpectWhole(124, length, length, INT_MAX);
    if (HasFatalFailure()) return;
  }
}

TEST(PrefixLengths, TagsOfAnyLengthAreCutAt127Characters) {
  for (size_t tag = 0; tag < 700; ++tag) {
    ExpectWhole(tag, 4, 4, 1);
    if (HasFatalFailure()) return;
  }
}

}  // namespace
