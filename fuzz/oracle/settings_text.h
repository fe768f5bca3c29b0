// A plain second reading of settings files, line by line, and of the list of levels.
#ifndef TARNWICK_FUZZ_ORACLE_SETTINGS_TEXT_H_
#define TARNWICK_FUZZ_ORACLE_SETTINGS_TEXT_H_

#include <optional>
#include <string>
#include <vector>

namespace oracle {

// A key that a line can have.
bool IsWord(const std::string& key);

// The lines of `text`, each with its line feed; the last one may have none.
std::vector<std::string> LinesOf(const std::string& text);

// The value of `key` in one line, if the line has one.
std::optional<std::string> ValueIn(const std::string& line, const std::string& key);

// The value of `key` in the first line that has one.
std::optional<std::string> ValueOf(const std::string& text, const std::string& key);

// The text after setting the key.
std::string WithSetting(const std::string& text, const std::string& key, const std::string& line);

// Key and value in a format of two "%s" and any number of "%%"; nothing for another format.
std::optional<std::string> Formatted(const std::string& format, const std::string& key,
                                     const std::string& value);

// A key and a value that can be read back from a file in the usual format.
bool CanBeReadBack(const std::string& key, const std::string& value);

// The numbers between the delimiters.
// REQUIRES: no zero byte in either.
std::vector<int> IntList(const std::string& text, const std::string& delimiters);

// The record of levels: what loading the file's text makes of it.
struct Levels {
  std::vector<int> levels;
  bool milliseconds = false;
};

// Results: 0, or -1 when one of the two keys has no value.
int Load(const std::string& text, Levels* record);

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_SETTINGS_TEXT_H_
