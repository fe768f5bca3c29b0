// The list of kept header fields, and what else has to know each of them.
#include "tarnwick/http/kept_fields.h"

#include <gtest/gtest.h>

#include <fstream>
#include <set>
#include <sstream>
#include <string>

using namespace tarnwick;

TEST(KeptFields, NoNameBeginsWithAnother) {
  for (const KeptField& field : kKeptFields) {
    for (const KeptField& other : kKeptFields) {
      if (&other == &field) continue;
      EXPECT_NE(field.name.substr(0, other.name.size()), other.name);
    }
  }
}

TEST(KeptFields, EachContentFieldHasAKeyOfItsOwn) {
  std::set<HTTP_MAP_KEY> keys;
  for (const KeptField& field : kKeptFields) {
    if (field.as != KeptAs::kContent) continue;
    EXPECT_TRUE(keys.insert(field.key).second) << field.name;
  }
}

// A fuzzer does not guess a name that it has never seen.
TEST(KeptFields, EachNameIsInTheDictionaryOfTheFuzzTargets) {
  const std::ifstream file(TARNWICK_SOURCE_DIR "/fuzz/http.dict");
  std::stringstream words;
  words << file.rdbuf();
  for (const KeptField& field : kKeptFields) {
    const std::string word = "\"" + std::string(field.name) + "\"";
    EXPECT_NE(words.str().find(word), std::string::npos) << field.name;
  }
}
