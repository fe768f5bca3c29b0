// Categories, levels and their names.
#include <gtest/gtest.h>
#include <sys/types.h>

#include <map>
#include <regex>
#include <set>
#include <string>
#include <type_traits>

#include "tarnwick/log/log_names.h"
#include "tarnwick/log/twdebuglog.h"
#include "tests/support/process.h"

using namespace tarnwick;

namespace {

LOG_CATEG Categ(int value) {
  return static_cast<LOG_CATEG>(value);
}
LOG_LEVEL Level(int value) {
  return static_cast<LOG_LEVEL>(value);
}

TEST(Enum2String, Level3IsNoticeAndLevelsOutsideAreUnknownWithoutBecomingEntries) {
  EXPECT_STREQ(Enum2String<LOG_LEVEL>(Level(3)), "notice");
  EXPECT_STREQ(Enum2String<LOG_LEVEL>(Level(8)), "unknown");
  EXPECT_STREQ(Enum2String<LOG_LEVEL>(Level(-1)), "unknown");
  EXPECT_EQ(NameMap<LOG_LEVEL>().size(), 8u);
}

TEST(Enum2String, Categories26And57And66AreTheLibrarysOwnAnd74IsUnknown) {
  EXPECT_STREQ(Enum2String<LOG_CATEG>(Categ(26)), "http");
  EXPECT_STREQ(Enum2String<LOG_CATEG>(Categ(57)), "socket");
  EXPECT_STREQ(Enum2String<LOG_CATEG>(Categ(66)), "utils");
  EXPECT_STREQ(Enum2String<LOG_CATEG>(Categ(74)), "unknown");
  EXPECT_EQ(NameMap<LOG_CATEG>().size(), 74u);
}

// The program starts threads that make the process's first call together, after an attempt that ran
// out of memory. All but one wait, and signals interrupt their wait.
TEST(Enum2String, ThreadsThatMakeTheFirstCallTogetherGetOneMapBuiltOnceAndKeepErrno) {
  std::string output;
  EXPECT_EQ(RunProgram({TARNWICK_FIRST_NAMES}, &output).code, 0);
  EXPECT_EQ(output, "out of memory\n74 entries, 1 map, errno kept by 8\n");
}

TEST(Enum2String, EveryLevelHasItsName) {
  const char* const names[] = {"alarm", "error", "warn",   "notice",
                               "info",  "debug", "debug2", "debug3"};
  for (int value = 0; value < 8; ++value) {
    EXPECT_STREQ(Enum2String<LOG_LEVEL>(Level(value)), names[value]);
  }
}

TEST(Enum2String, ValuesFarOutsideAreUnknown) {
  for (const int value : {-2147483647 - 1, -1, 74, 75, 1000, 2147483647}) {
    EXPECT_STREQ(Enum2String(Categ(value)), "unknown");
    EXPECT_STREQ(Enum2String(Level(value)), "unknown");
  }
  EXPECT_EQ(NameMap<LOG_CATEG>().size(), 74u);
  EXPECT_EQ(NameMap<LOG_LEVEL>().size(), 8u);
}

TEST(Enum2String, ANameStaysWhereItIs) {
  EXPECT_EQ(Enum2String(Categ(26)), Enum2String(Categ(26)));
}

TEST(Enum2String, AnEmptyMapReturnsUnknown) {
  EXPECT_STREQ(FindName(std::map<LOG_LEVEL, const char*>(), Level(3)), "unknown");
}

TEST(LogCateg, TagsAreShortLowerCaseWordsWithoutDoubles) {
  const std::regex tag("[a-z]+([-_][a-z]+)*");
  std::set<std::string> seen;
  for (const auto& [value, name] : TWEnum2StrMap<LOG_CATEG>()) {
    EXPECT_TRUE(std::regex_match(name, tag)) << name;
    EXPECT_TRUE(seen.insert(name).second) << name;
  }
  EXPECT_EQ(seen.size(), 74u);
}

TEST(LogCateg, TheFirst69StandInTheOrderOfTheirModules) {
  std::string before;
  for (int value = 0; value <= 68; ++value) {
    const std::string name = Enum2String(Categ(value));
    const std::string module = name.substr(0, name.find_first_of("-_"));
    EXPECT_LE(before, module) << value;
    before = module;
  }
}

TEST(LogCateg, AModulesSubTagsFollowTheModulesOwnTag) {
  std::set<std::string> modules;
  for (int value = 0; value <= 68; ++value) {
    const std::string name = Enum2String(Categ(value));
    const size_t cut = name.find('-');
    if (cut == std::string::npos) {
      modules.insert(name);
    } else {
      EXPECT_EQ(modules.count(name.substr(0, cut)), 1u) << name;
    }
  }
}

TEST(LogEnums, AreAsWideAsInt) {
  EXPECT_TRUE((std::is_same_v<std::underlying_type_t<LOG_CATEG>, int>));
  EXPECT_TRUE((std::is_same_v<std::underlying_type_t<LOG_LEVEL>, int>));
  EXPECT_TRUE((std::is_same_v<std::underlying_type_t<LOG_TYPE>, int>));
  EXPECT_TRUE((std::is_convertible_v<LOG_LEVEL, int>));
}

TEST(TWEnum2StrMap, HoldsEveryNameInTheOrderOfTheValues) {
  const TWEnum2StrMap<LOG_CATEG> categories;
  int value = 0;
  for (const auto& [key, name] : categories) EXPECT_EQ(static_cast<int>(key), value++) << name;
  EXPECT_EQ(value, 74);
  EXPECT_EQ(TWEnum2StrMap<LOG_LEVEL>().size(), 8u);
}

TEST(TWEnum2StrMap, MapsAreIndependentAndShareTheNames) {
  TWEnum2StrMap<LOG_LEVEL> map;
  map.clear();
  EXPECT_EQ(TWEnum2StrMap<LOG_LEVEL>().at(LOG_LEVEL_INFO), Enum2String(LOG_LEVEL_INFO));
}

}  // namespace
