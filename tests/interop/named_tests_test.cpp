// The tests that documents name exist.
#include <gtest/gtest.h>

#include <filesystem>
#include <regex>

#include "tests/support/files.h"

namespace {

namespace fs = std::filesystem;

// The sources of all tests, one after the other.
std::string AllTests() {
  std::string text;
  for (const auto& entry : fs::recursive_directory_iterator(TARNWICK_INTEROP_FOLDER "/..")) {
    if (entry.path().extension() == ".cpp") text += ReadFile(entry.path().string());
  }
  return text;
}

class NamedTests : public ::testing::TestWithParam<const char*> {};

TEST_P(NamedTests, Exist) {
  const std::string tests = AllTests();
  const std::string document = ReadFile(std::string(TARNWICK_DOCS_FOLDER "/") + GetParam());
  const std::regex name("`([A-Za-z0-9]+)\\.([A-Za-z0-9]{12,})`");
  int names = 0;
  for (std::sregex_iterator it(document.begin(), document.end(), name), end; it != end; ++it) {
    const std::string declared = (*it)[1].str() + ", " + (*it)[2].str() + ")";
    EXPECT_NE(tests.find(declared), std::string::npos) << it->str();
    ++names;
  }
  EXPECT_GT(names, 20);
}

INSTANTIATE_TEST_SUITE_P(OfTheDocument, NamedTests,
                         ::testing::Values("deliberate.md", "limits.md", "../SECURITY.md"));

}  // namespace
