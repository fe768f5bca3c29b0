// The steps between the shared record and the settings file.
#ifndef TARNWICK_LOG_LOG_SETTINGS_H_
#define TARNWICK_LOG_LOG_SETTINGS_H_

#include <string>
#include <vector>

namespace tarnwick {

// The signed decimal integers of `text` between any of the characters `delimiters`. Empty fields
// are skipped; a field that is no number is 0, and what follows a number is ignored.
std::vector<int> SplitToIntList(const std::string& text, const std::string& delimiters);

// The platform's reading function. Results: more than 0 when the key was found with a value.
int ReadSettingValue(const char* path, const char* key, char* value, int size);

// The platform's writing function under an exclusive flock of the file, which is created when
// missing. Results: those of the platform's function; -1 when the file could not be opened or
// locked.
int WriteSettingValue(const char* path, const char* key, const char* value, const char* format);

}  // namespace tarnwick

#endif  // TARNWICK_LOG_LOG_SETTINGS_H_
