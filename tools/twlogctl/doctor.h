// What stops logging: each check looks at one thing and says what to do about it.
#ifndef TARNWICK_TOOLS_TWLOGCTL_DOCTOR_H_
#define TARNWICK_TOOLS_TWLOGCTL_DOCTOR_H_

#include <sys/stat.h>

#include <string>
#include <vector>

enum class Verdict { kRight, kNote, kWrong };

struct Finding {
  std::string check;  // "folder", "space", "file", "lock", "limit", "record", "settings", ...
  Verdict verdict = Verdict::kRight;
  std::string text;
  std::string fix;  // for a wrong thing: one step, a command where there is one
};
using Findings = std::vector<Finding>;

void CheckDirectory(Findings* findings);
void CheckSpace(Findings* findings);
void CheckFiles(Findings* findings);
void CheckLocks(Findings* findings);
void CheckFileSizeLimits(Findings* findings);
void CheckRecord(Findings* findings);
void CheckLevels(Findings* findings);
void CheckDaemons(Findings* findings);
void CheckSettings(Findings* findings);
void CheckRotation(Findings* findings);

// Runs all checks and prints what they found. Results: the exit code, kExitWrong when something is
// wrong.
int RunDoctor(bool json);

#endif  // TARNWICK_TOOLS_TWLOGCTL_DOCTOR_H_
