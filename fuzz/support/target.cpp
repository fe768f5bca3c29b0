#include "fuzz/support/target.h"

#include <cctype>
#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include "tarnwick/log/twdebuglog.h"

namespace {

std::string Printable(std::string_view text) {
  constexpr size_t kMost = 4096;
  std::string out;
  for (const char c : text.substr(0, kMost)) {
    char escaped[8];
    const auto byte = static_cast<unsigned char>(c);
    std::snprintf(escaped, sizeof(escaped), "\\x%02x", byte);
    out += std::isprint(byte) != 0 && c != '\\' ? std::string(1, c) : escaped;
  }
  return out;
}

}  // namespace

void LogEverything() {
  static TWDbgLogCfg record;
  static const bool filled = [] {
    for (int i = 0; i < LOG_CATEG_COUNT; ++i) {
      record.SetLevel(static_cast<LOG_CATEG>(i), LOG_LEVEL_DEBUG3);
    }
    return true;
  }();
  static_cast<void>(filled);
  g_pDbgLogCfg = &record;
}

void ExpectSame(const char* what, int64_t library, int64_t oracle) {
  if (library == oracle) return;
  std::fprintf(stderr, "difference in %s\n  library: %" PRId64 "\n  oracle:  %" PRId64 "\n", what,
               library, oracle);
  std::abort();
}

void ExpectSame(const char* what, std::string_view library, std::string_view oracle) {
  if (library == oracle) return;
  std::fprintf(
      stderr, "difference in %s\n  library: %zu bytes \"%s\"\n  oracle:  %zu bytes \"%s\"\n", what,
      library.size(), Printable(library).c_str(), oracle.size(), Printable(oracle).c_str());
  std::abort();
}

void Expect(const char* what, bool holds) {
  if (holds) return;
  std::fprintf(stderr, "broken: %s\n", what);
  std::abort();
}
