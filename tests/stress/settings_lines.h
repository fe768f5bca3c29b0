// The settings file of the settings cases: who writes what, and the check of what is read.
#ifndef TARNWICK_TESTS_STRESS_SETTINGS_LINES_H_
#define TARNWICK_TESTS_STRESS_SETTINGS_LINES_H_

#include <sys/stat.h>

#include <array>
#include <string>

#include "tests/stress/stress.h"

inline constexpr char kSettingsFolder[] = "/var/packages/Tarnwick/etc";
inline constexpr char kSettingsFile[] = "/var/packages/Tarnwick/etc/settings.conf";

// Seven writers have a key each; the eighth saves a record of levels, which has two.
inline constexpr int kSettingsWriters = 8;
inline constexpr int kLevelsWriter = 7;

// How often each writer has written its key. The last entry is that of the levels' second key, of
// which the file shows only whether it is odd.
using Rounds = std::array<int, kSettingsWriters + 1>;

std::string KeyOf(int writer);

// A value, at most 3,000 bytes long, that tells writer and round.
std::string ValueOf(int writer, int round);

// The whole file: comments at both ends, and the keys between them.
std::string SettingsTextOf(const Rounds& rounds);

// Does a writer's round. Results: those of the library's call.
int WriteRound(int writer, int round);

// What is wrong with a whole file; empty when nothing is. `*rounds` receives what it shows.
std::string ProblemIn(const std::string& text, Rounds* rounds);

// What is wrong with a value that was read, of which the round must be in the given range.
std::string ProblemInValue(int writer, const std::string& value, int least, int most);

// Makes the file of round 0 with a mode and, where that is possible, an owner of its own.
// Results: its attributes.
struct stat MakeSettingsFile();

// Fails unless mode and owner are as before, nothing stands beside the file, and it is whole.
void ExpectGoodSettings(const struct stat& before, CaseResult& result);

bool SameAttributes(const struct stat& a, const struct stat& b);

#endif  // TARNWICK_TESTS_STRESS_SETTINGS_LINES_H_
