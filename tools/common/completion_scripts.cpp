// What the shells read: each script hands the words up to the cursor to the tool and offers what it
// prints.
#include "tools/common/completion.h"

namespace {

// Readline takes the characters of COMP_WORDBREAKS for the ends of words, so what stands before the
// last one must not be in the candidates.
constexpr char kBash[] = R"sh(# Completion of TOOL for bash.
_TOOL() {
  local line=${COMP_LINE:0:COMP_POINT} word candidate
  local -a typed
  COMPREPLY=()
  read -ra typed <<<"$line"
  if [[ $line == *[[:blank:]] ]]; then typed+=(''); fi
  word=${typed[-1]}
  while IFS=$'\t' read -r candidate _; do
    if [[ $candidate == @file ]]; then
      compopt -o filenames 2>/dev/null
      mapfile -t COMPREPLY < <(compgen -f -- "${word#--*=}")
      return
    fi
    if [[ $candidate == *= ]]; then compopt -o nospace 2>/dev/null; fi
    COMPREPLY+=("${candidate#"${word%"${word##*[=:]}"}"}")
  done < <(command TOOL __complete "${typed[@]:1}" 2>/dev/null)
}

complete -F _TOOL TOOL
)sh";

constexpr char kZsh[] = R"sh(#compdef TOOL
_TOOL() {
  local line candidate
  local -a offered described closed open
  offered=("${(@f)$(command TOOL __complete "${(@)words[2,CURRENT-1]}" "$PREFIX" 2>/dev/null)}")
  if [[ $offered[1] == @file ]]; then
    compset -P 1 -- '--*='
    _files
    return
  fi
  for line in $offered; do
    candidate=${line%%$'\t'*}
    if [[ $line == *$'\t'* ]]; then
      described+=("$candidate:${line#*$'\t'}")
    elif [[ $candidate == *= ]]; then
      open+=("${${candidate%=}##*[=,]}")
    else
      closed+=("${candidate##*[=,]}")
    fi
  done
  if (( $#described )); then
    _describe TOOL described
    return
  fi
  compset -P '*[=,]'
  compadd -S '=' -- $open
  compadd -- $closed
}

# As a file of $fpath this text is the function itself; it may be read by `source` too.
if [[ ${funcstack[1]-} == _TOOL ]]; then
  _TOOL "$@"
else
  compdef _TOOL TOOL
fi
)sh";

constexpr char kFish[] = R"sh(# Completion of TOOL for fish.
function _TOOL
    set -l typed (commandline -opc)
    set -l word (commandline -ct)
    set -l offered (command TOOL __complete $typed[2..] "$word" 2>/dev/null)
    if test "$offered" = @file
        set -l option (string match -r -- '^--[^=]*=' "$word")
        set offered "$option"(__fish_complete_path (string replace -r -- '^--[^=]*=' '' "$word"))
    end
    printf '%s\n' $offered
end

complete -c TOOL -f -a '(_TOOL)'
)sh";

}  // namespace

std::string CompletionScript(const std::string& tool, const std::string& shell) {
  std::string script = shell == "bash" ? kBash : shell == "zsh" ? kZsh : kFish;
  constexpr char kPlaceholder[] = "TOOL";
  for (size_t at = script.find(kPlaceholder); at != std::string::npos;
       at = script.find(kPlaceholder, at + tool.size())) {
    script.replace(at, sizeof(kPlaceholder) - 1, tool);
  }
  return script;
}
