// Words of a command that a person copies into a shell.
#ifndef TARNWICK_TOOLS_COMMON_SHELL_H_
#define TARNWICK_TOOLS_COMMON_SHELL_H_

#include <string>
#include <string_view>

// `text` as one word of a POSIX shell: as it is when it needs no quotes, else in single ones. With
// a byte that a terminal would act upon or hide it is a $'...' word (POSIX.1-2024, 2.2.4), which is
// plain ASCII: bash, zsh, ksh and busybox know it.
std::string QuoteForShell(std::string_view text);

#endif  // TARNWICK_TOOLS_COMMON_SHELL_H_
