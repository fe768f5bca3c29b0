#include "tools/twlogctl/report.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <cstdio>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tools/common/names.h"
#include "tools/common/terminal.h"
#include "tools/common/text.h"

namespace {

std::string Hint(const std::string& text, const std::vector<std::string>& names) {
  const std::string hint = DidYouMean(text, names);
  return hint.empty() ? "" : " (" + hint + ")";
}

}  // namespace

void Complain(const std::string& text) {
  PrintError("twlogctl", text);
}

bool IsRootOrCaller(uid_t user) {
  return user == 0 || user == geteuid();
}

std::string LevelText(int level) {
  if (level < LOG_LEVEL_ALARM || level > LOG_LEVEL_DEBUG3) return std::to_string(level);
  return Enum2String(static_cast<LOG_LEVEL>(level));
}

std::string LevelWords(int level) {
  const bool known = level >= LOG_LEVEL_ALARM && level <= LOG_LEVEL_DEBUG3;
  return LevelText(level) + (known ? "" : ", out of range");
}

std::string UserName(uid_t user) {
  const struct passwd* const entry = getpwuid(user);
  return entry != nullptr ? entry->pw_name : std::to_string(user);
}

std::string GroupName(gid_t group) {
  const struct group* const entry = getgrgid(group);
  return entry != nullptr ? entry->gr_name : std::to_string(group);
}

std::string ModeText(mode_t mode) {
  char text[16];
  snprintf(text, sizeof(text), "%04o", static_cast<unsigned>(mode & 07777));
  return text;
}

std::string DidYouMeanCategory(const std::string& text) {
  return Hint(text, CategoryNames());
}

std::string DidYouMeanLevel(const std::string& text) {
  return Hint(text, LevelNames());
}
