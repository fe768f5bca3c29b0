// The beginning of a line beside one that formats make, on random names, numbers and times.
#include <gtest/gtest.h>
#include <unistd.h>

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <random>
#include <string>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

// What a line is made of.
struct Line {
  timeval time;
  bool milliseconds;
  std::string categ;
  std::string level;
  std::string source;
  int number;
  std::string function;
};

std::string PlainPrefix(const Line& line) {
  char time[128];
  struct tm parts;
  localtime_r(&line.time.tv_sec, &parts);
  std::string text(time, strftime(time, sizeof(time), "%b %e %T", &parts));
  char part[128];
  if (line.milliseconds) {
    snprintf(part, sizeof(part), ".%03ld", static_cast<long>(line.time.tv_usec / 1000));
    text += part;
  }
  text += " [" + std::to_string(getpid()) + "]";
  snprintf(part, sizeof(part), "[%s][%s]", line.categ.c_str(), line.level.c_str());
  text += part;
  return text + " " + line.source + ":" + std::to_string(line.number) + ":" + line.function +
         "(): ";
}

std::string RandomName(std::mt19937* random, size_t longest) {
  return std::string((*random)() % (longest + 1), static_cast<char>('a' + (*random)() % 26));
}

Line RandomLine(std::mt19937* random) {
  constexpr int kNumbers[] = {0, 9, 10, 99, 1234, -1, -10, INT_MAX, INT_MIN};
  Line line;
  line.time = {static_cast<time_t>((*random)() % INT32_MAX),
               static_cast<suseconds_t>((*random)() % 1000000)};
  line.milliseconds = (*random)() % 2 == 0;
  line.categ = RandomName(random, 70);
  line.level = RandomName(random, 70);
  line.source = RandomName(random, 600);
  line.number = kNumbers[(*random)() % (sizeof(kNumbers) / sizeof(kNumbers[0]))];
  line.function = RandomName(random, 600);
  return line;
}

class WriterPrefix : public ::testing::Test {
 protected:
  WriterPrefix() {
    setenv("TZ", "XXX-5:30YYY,M3.2.0,M11.1.0", 1);
    tzset();
    InitDbgCfg();
  }
  ~WriterPrefix() override {
    FreeDbgCfg();
    unlink(kMainLog);
    setenv("TZ", "UTC", 1);
    tzset();
  }

  std::string Written(const Line& line) {
    record_.SetTimeScale(line.milliseconds);
    faults_.Clock([time = line.time] { return time; });
    unlink(kMainLog);
    TWPrintf(LOG_TYPE_MAIN, line.categ.c_str(), line.level.c_str(), line.source.c_str(),
             line.number, line.function.c_str(), "message\n");
    return ReadFile(kMainLog);
  }

  SharedRecord record_;
  Faults faults_;
};

TEST_F(WriterPrefix, IsWhatFormatsMakeOfNamesOfAnyLength) {
  std::mt19937 random(7);
  for (int i = 0; i < 2000; ++i) {
    const Line line = RandomLine(&random);
    ASSERT_EQ(Written(line), PlainPrefix(line) + "message\n") << i;
  }
}

TEST_F(WriterPrefix, IsWholeWhereverItsNamesReachTheEndOfTheBuffer) {
  Line line = {{1709647389, 417999}, true, "http", "warn", "", INT_MIN, "Func"};
  for (size_t length = 380; length < 520; ++length) {
    line.source.assign(length, 's');
    line.function.assign(900 - length, 'f');
    ASSERT_EQ(Written(line), PlainPrefix(line) + "message\n") << length;
    line.function.assign(length % 40, 'f');
    ASSERT_EQ(Written(line), PlainPrefix(line) + "message\n") << length;
  }
}

TEST_F(WriterPrefix, EveryDayAndSecondHasItsTwoPlaces) {
  Line line = {{0, 0}, false, "http", "warn", "name", 57, "Func"};
  for (int step = 0; step < 2000; ++step) {
    line.time.tv_sec = step * time_t{37033};  // through 2 years and each second of the minute
    ASSERT_EQ(Written(line), PlainPrefix(line) + "message\n") << step;
  }
}

}  // namespace
