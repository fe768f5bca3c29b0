#include "tools/common/shell.h"

#include <cstdio>

#include "tools/common/terminal.h"

namespace {

constexpr std::string_view kPlain =
    "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_./:=@,+%";

// Three octal digits: what follows them is never taken for a fourth.
std::string InDollarQuotes(std::string_view text) {
  std::string quoted = "$'";
  for (const char c : text) {
    char octal[8];
    const auto byte = static_cast<unsigned char>(c);
    const bool special = byte < ' ' || byte > '~' || c == '\'' || c == '\\';
    snprintf(octal, sizeof(octal), "\\%03o", static_cast<unsigned>(byte));
    quoted += special ? octal : std::string(1, c);
  }
  return quoted + "'";
}

}  // namespace

std::string QuoteForShell(std::string_view text) {
  if (!text.empty() && text.find_first_not_of(kPlain) == std::string_view::npos) {
    return std::string(text);
  }
  if (EscapeControls(text, Backslash::kKept) != text) return InDollarQuotes(text);
  std::string quoted = "'";
  for (const char c : text) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}
