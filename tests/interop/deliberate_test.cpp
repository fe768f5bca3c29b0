// The tests that docs/deliberate.md names exist.
#include <gtest/gtest.h>

#include <filesystem>
#include <regex>

#include "tests/support/files.h"

namespace {

namespace fs = std::filesystem;

// The sources of all tests, one behind the other.
std::string AllTests() {
  std::string text;
  for (const auto& entry : fs::recursive_directory_iterator(TARNWICK_INTEROP_FOLDER "/..")) {
    if (entry.path().extension() == ".cpp") text += ReadFile(entry.path().string());
  }
  return text;
}

TEST(Deliberate, EachLineNamesTestsThatExist) {
  const std::string tests = AllTests();
  const std::string document = ReadFile(TARNWICK_DOCS_FOLDER "/deliberate.md");
  const std::regex name("`([A-Za-z0-9]+)\\.([A-Za-z0-9]{12,})`");
  int names = 0;
  for (std::sregex_iterator it(document.begin(), document.end(), name), end; it != end; ++it) {
    const std::string declared = (*it)[1].str() + ", " + (*it)[2].str() + ")";
    EXPECT_NE(tests.find(declared), std::string::npos) << it->str();
    ++names;
  }
  EXPECT_GT(names, 30);
}

}  // namespace
