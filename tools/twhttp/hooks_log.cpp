// The hook of the log: the lines of the run are evidence, and belong to whoever runs the tool
// rather than into the log of the daemons.
#include <cstdarg>
#include <cstdio>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unique.h"
#include "tools/twhttp/hooks.h"

namespace {

constexpr size_t kMostLines = 1000;

std::string Formatted(const char* format, va_list arguments) __attribute__((format(printf, 1, 0)));
std::string Formatted(const char* format, va_list arguments) {
  char* text = nullptr;
  if (vasprintf(&text, format, arguments) < 0) return "";
  const tarnwick::UniqueMalloc<char> owner(text);
  return text;
}

// A line may hold a whole body; its beginning and its end tell enough.
std::string Shortened(const std::string& text) {
  constexpr size_t kEnd = 500;
  if (text.size() <= 2 * kEnd) return text;
  return text.substr(0, kEnd) + " ... " + text.substr(text.size() - kEnd);
}

}  // namespace

// TWPrintf, whose C++ name the linker's option spells out.
extern "C" void __wrap__Z8TWPrintf8LOG_TYPEPKcS1_S1_iS1_S1_z(LOG_TYPE type, const char* categ,
                                                             const char* level, const char* file,
                                                             int line, const char* func,
                                                             const char* format, ...)
    __attribute__((format(printf, 7, 8)));
extern "C" void __wrap__Z8TWPrintf8LOG_TYPEPKcS1_S1_iS1_S1_z(LOG_TYPE /*type*/, const char* categ,
                                                             const char* level,
                                                             const char* /*file*/, int /*line*/,
                                                             const char* func, const char* format,
                                                             ...) {
  const Hooks* const hooks = CurrentHooks();
  if (hooks == nullptr || hooks->trace->log.size() >= kMostLines) return;
  va_list arguments;
  va_start(arguments, format);
  const std::string message = Shortened(Formatted(format, arguments));
  va_end(arguments);
  std::string text = std::string(categ != nullptr ? categ : "-") + " " +
                     (level != nullptr ? level : "-") + " " + func + "(): " + message;
  while (!text.empty() && text.back() == '\n') text.pop_back();
  hooks->trace->log.push_back(text);
}

LogAtFullDetail::LogAtFullDetail() : previous_(g_pDbgLogCfg) {
  static TWDbgLogCfg levels;
  for (int categ = 0; categ < LOG_CATEG_COUNT; ++categ) {
    levels.SetLevel(static_cast<LOG_CATEG>(categ), LOG_LEVEL_DEBUG3);
  }
  g_pDbgLogCfg = &levels;
}

LogAtFullDetail::~LogAtFullDetail() {
  g_pDbgLogCfg = previous_;
}
