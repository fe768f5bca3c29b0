// The text of a settings file, without a file.
#include "tarnwick/platform/settings_text.h"

#include <gtest/gtest.h>

#include <string>

using namespace tarnwick;

namespace {

TEST(FindSettingsLine, ReturnsWhereTheLineIs) {
  const std::string text = "a=\"1\"\nname=\"value\"\nb=\"2\"\n";
  const SettingsLine line = FindSettingsLine(text, "name");
  ASSERT_TRUE(line.found);
  EXPECT_EQ(text.substr(line.begin, line.end - line.begin), "name=\"value\"\n");
  EXPECT_EQ(line.value, "value");
}

TEST(FindSettingsLine, AKeyThatIsNotThereIsNotFound) {
  EXPECT_FALSE(FindSettingsLine("", "name").found);
  EXPECT_FALSE(FindSettingsLine("\n\n", "name").found);
  EXPECT_FALSE(FindSettingsLine("name", "name").found);
}

TEST(FindSettingsLine, AnUnclosedQuoteReturnsTheRestOfTheLine) {
  EXPECT_EQ(FindSettingsLine("name=\"value\n", "name").value, "value");
  EXPECT_EQ(FindSettingsLine("name=\"\n", "name").value, "");
}

// A writer may have been cut at any byte on a file system that lost power.
TEST(FindSettingsLine, TextCutAtAnyByteReturnsAPrefixOfTheValueOrNothing) {
  const std::string text = "name=\"value\"\n";
  for (size_t cut = 0; cut <= text.size(); ++cut) {
    const SettingsLine line = FindSettingsLine(std::string_view(text).substr(0, cut), "name");
    const std::string value(line.value);
    EXPECT_EQ(std::string("value").substr(0, value.size()), value) << cut;
    EXPECT_EQ(line.found, cut >= 5) << cut;
  }
}

TEST(ReplaceSettingsLine, ReplacingTwiceIsReplacingOnce) {
  const std::string line = "name=\"new\"\n";
  for (const char* text : {"", "a=1", "a=1\n", "name=old", "x\nname=old\ny\n", "name=\nname=\n"}) {
    const std::string once = ReplaceSettingsLine(text, "name", line);
    EXPECT_EQ(ReplaceSettingsLine(once, "name", line), once) << text;
  }
}

TEST(FormatSettingsLine, PutsKeyAndValueInTheirPlaces) {
  std::string line;
  EXPECT_TRUE(FormatSettingsLine("%s=\"%s\"\n", "key", "value", &line));
  EXPECT_EQ(line, "key=\"value\"\n");
}

TEST(FormatSettingsLine, PercentSignsInTheValueAreText) {
  std::string line;
  EXPECT_TRUE(FormatSettingsLine("%s:%s%%\n", "%s", "%n%%", &line));
  EXPECT_EQ(line, "%s:%n%%%\n");
}

TEST(ReplaceSettingsLine, ALineWithoutItsEndDoesNotSwallowTheNextKey) {
  EXPECT_EQ(ReplaceSettingsLine("a=\"1\"\nb=\"2\"\n", "a", "a=\"3\""), "a=\"3\"\nb=\"2\"\n");
  EXPECT_EQ(ReplaceSettingsLine("a=\"1\"\nb=\"2\"\n", "b", "b=\"3\""), "a=\"1\"\nb=\"3\"");
}

}  // namespace
