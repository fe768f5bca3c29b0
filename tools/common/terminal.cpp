#include "tools/common/terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>

#include "tarnwick/utils/utf8.h"

namespace {

const char* CodeOf(Colour colour) {
  switch (colour) {
    case Colour::kNone:
      return "";
    case Colour::kRed:
      return "\x1b[31m";
    case Colour::kGreen:
      return "\x1b[32m";
    case Colour::kYellow:
      return "\x1b[33m";
    case Colour::kBlue:
      return "\x1b[34m";
    case Colour::kMagenta:
      return "\x1b[35m";
    case Colour::kCyan:
      return "\x1b[36m";
    case Colour::kGrey:
      return "\x1b[90m";
    case Colour::kBold:
      return "\x1b[1m";
  }
  return "";
}

struct Range {
  char32_t first;
  char32_t last;
};

// Characters of Unicode 15 that change the direction of what stands around them, and those that
// have neither width nor shape: the soft hyphen, marks and isolates of direction, joiners, line and
// paragraph separators, byte order mark, annotations, tags.
constexpr Range kHidden[] = {
    {0x00AD, 0x00AD}, {0x061C, 0x061C}, {0x180E, 0x180E}, {0x200B, 0x200F},   {0x2028, 0x202E},
    {0x2060, 0x206F}, {0xFEFF, 0xFEFF}, {0xFFF9, 0xFFFB}, {0xE0000, 0xE007F},
};

// REQUIRES: valid UTF-8, one character.
char32_t CodePoint(std::string_view character) {
  constexpr unsigned char kLeadBits[] = {0, 0x7F, 0x1F, 0x0F, 0x07};
  char32_t code = static_cast<unsigned char>(character[0]) & kLeadBits[character.size()];
  for (const char byte : character.substr(1)) {
    code = code << 6 | (static_cast<unsigned char>(byte) & 0x3F);
  }
  return code;
}

bool IsHidden(char32_t code) {
  return std::any_of(std::begin(kHidden), std::end(kHidden), [code](const Range& range) {
    return code >= range.first && code <= range.last;
  });
}

// Terminals take U+0080 to U+009F for control sequences as well.
bool IsC1Control(std::string_view character) {
  return character.size() == 2 && character[0] == '\xC2' &&
         static_cast<unsigned char>(character[1]) < 0xA0;
}

void AppendEscaped(char byte, std::string* result) {
  switch (byte) {
    case '\n':
      result->append("\\n");
      return;
    case '\r':
      result->append("\\r");
      return;
    case '\t':
      result->append("\\t");
      return;
    case '\\':
      result->append("\\\\");
      return;
    default:
      break;
  }
  char text[8];
  snprintf(text, sizeof(text), "\\x%02X", static_cast<unsigned>(static_cast<unsigned char>(byte)));
  result->append(text);
}

void AppendHidden(char32_t code, std::string* result) {
  char text[16];
  snprintf(text, sizeof(text), "\\u%04X", static_cast<unsigned>(code));
  result->append(text);
}

bool IsPlain(std::string_view character, Backslash backslash) {
  const char first = character[0];
  if (character.size() > 1) return !IsC1Control(character);
  if (first == '\\') return backslash == Backslash::kKept;
  return first >= ' ' && first != '\x7F';
}

}  // namespace

bool IsTerminal(int fd) {
  return isatty(fd) == 1;
}

bool MayColour(int fd) {
  const char* const no_colour = std::getenv("NO_COLOR");
  if (no_colour != nullptr && *no_colour != '\0') return false;
  const char* const type = std::getenv("TERM");
  return type != nullptr && *type != '\0' && std::strcmp(type, "dumb") != 0 && IsTerminal(fd);
}

std::string InColour(Colour colour, std::string_view text, bool enabled) {
  if (!enabled || colour == Colour::kNone) return std::string(text);
  std::string result(CodeOf(colour));
  result.append(text);
  result.append("\x1b[0m");
  return result;
}

int TerminalWidth(int fd) {
  struct winsize size = {};
  if (ioctl(fd, TIOCGWINSZ, &size) == 0 && size.ws_col > 0) return size.ws_col;
  return 80;
}

std::string EscapeControls(std::string_view text, Backslash backslash) {
  std::string result;
  result.reserve(text.size());
  while (!text.empty()) {
    const size_t length = tarnwick::Utf8CharacterLength(text);
    const std::string_view character = text.substr(0, length == 0 ? 1 : length);
    if (length > 1 && IsHidden(CodePoint(character))) {
      AppendHidden(CodePoint(character), &result);
    } else if (length > 0 && IsPlain(character, backslash)) {
      result.append(character);
    } else {
      for (const char byte : character) AppendEscaped(byte, &result);
    }
    text.remove_prefix(character.size());
  }
  return result;
}

void PrintError(std::string_view program, std::string_view text) {
  const std::string line =
      EscapeControls(program) + ": " + EscapeControls(text, Backslash::kKept) + "\n";
  fputs(line.c_str(), stderr);
}
