// What every sub-command says in the same way.
#ifndef TARNWICK_TOOLS_TWLOGCTL_REPORT_H_
#define TARNWICK_TOOLS_TWLOGCTL_REPORT_H_

#include <sys/types.h>

#include <string>

// "twlogctl: text" on standard error, escaped for a terminal.
void Complain(const std::string& text);

// True for root and for the user who runs this: nobody else's files and records are to be trusted.
bool IsRootOrCaller(uid_t user);

// The name of a level, or the number when the record or a file holds one that has no name.
std::string LevelText(int level);

// The same for people: "99, out of range" for such a number.
std::string LevelWords(int level);

// The names of users and groups, or their numbers when nobody knows them.
std::string UserName(uid_t user);
std::string GroupName(gid_t group);

// "0660".
std::string ModeText(mode_t mode);

// " (did you mean a, b?)" with the names nearest to `text` among all categories, or all levels;
// empty when none is near.
std::string DidYouMeanCategory(const std::string& text);
std::string DidYouMeanLevel(const std::string& text);

#endif  // TARNWICK_TOOLS_TWLOGCTL_REPORT_H_
