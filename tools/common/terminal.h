// What a tool may do with its output: colour, progress and control bytes.
#ifndef TARNWICK_TOOLS_COMMON_TERMINAL_H_
#define TARNWICK_TOOLS_COMMON_TERMINAL_H_

#include <string>
#include <string_view>

enum class Colour { kNone, kRed, kGreen, kYellow, kBlue, kMagenta, kCyan, kGrey, kBold };

// True when `fd` is a terminal.
bool IsTerminal(int fd);

// True when `fd` is a terminal that takes colours: NO_COLOR (https://no-color.org) is unset or
// empty and TERM is neither missing nor "dumb".
bool MayColour(int fd);

// `text` in that colour, or as it is when `enabled` is false.
std::string InColour(Colour colour, std::string_view text, bool enabled);

// The columns of the terminal `fd`; 80 when `fd` is no terminal or its width is unknown.
int TerminalWidth(int fd);

enum class Backslash { kDoubled, kKept };

// `text` with every control byte, and every byte that is not part of valid UTF-8, written as \n,
// \r, \t or \xNN, and every character that turns the direction of text or shows as nothing as
// \uNNNN: what a peer or another user wrote can neither move the cursor nor show in another order
// than it has. A backslash is doubled, so that the text can be told from what stands for bytes; it
// is kept in commands, where it has a meaning, and in messages that may have been escaped already.
std::string EscapeControls(std::string_view text, Backslash backslash = Backslash::kDoubled);

// "program: text" on standard error, escaped, with kept backslashes.
void PrintError(std::string_view program, std::string_view text);

#endif  // TARNWICK_TOOLS_COMMON_TERMINAL_H_
