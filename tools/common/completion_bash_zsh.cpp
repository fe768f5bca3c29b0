// Bash and zsh share the tables, which are `case` statements in both, and the walk over the words
// that were typed; they differ in how candidates are handed over.
#include "tools/common/completion_model.h"

namespace {

std::string Quote(const std::string& text) {
  std::string result = "'";
  for (const char letter : text) {
    if (letter == '\'') {
      result += "'\\''";
    } else {
      result += letter;
    }
  }
  return result + "'";
}

// The lines of one value, whose places have names such as "set:1" or "set:--for".
std::string ValueCases(const std::vector<std::string>& places, const CompletedValue& value) {
  std::string plain;
  std::string assigned;
  for (const std::string& place : places) {
    if (!plain.empty()) plain += " | ", assigned += " | ";
    plain += Quote(place);
    assigned += Quote(place + "=");
  }
  std::string lines = "    " + plain + ") echo " + Quote(JoinWords(value.words)) + " ;;\n";
  if (!value.assigned.empty()) {
    lines += "    " + assigned + ") echo " + Quote(JoinWords(value.assigned)) + " ;;\n";
  }
  return lines;
}

std::string CasesOf(const CompletedCommand& command) {
  std::string cases;
  for (const CompletedOption& option : command.options) {
    if (!option.takes_value) continue;
    std::vector<std::string> places;
    for (const std::string& name : option.names) places.push_back(command.name + ":" + name);
    cases += ValueCases(places, option.value);
  }
  size_t position = 0;
  for (const CompletedArgument& argument : command.arguments) {
    std::vector<std::string> places = {command.name + ":" + std::to_string(++position)};
    if (argument.repeats) places.push_back(command.name + ":more");
    cases += ValueCases(places, argument.value);
  }
  return cases;
}

// The function that prints the words of a place, and fails for a place that takes no value.
std::string ValuesFunction(const CompletedProgram& program) {
  std::string cases;
  for (const CompletedCommand& command : program.commands) cases += CasesOf(command);
  return "_PROGRAM_values() {\n  case $1 in\n" + cases + "    *) return 1 ;;\n  esac\n}\n\n";
}

// The function that prints the options of a sub-command, a line for each.
std::string OptionsFunction(const CompletedProgram& program, bool described) {
  std::string cases;
  for (const CompletedCommand& command : program.commands) {
    cases += "    " + Quote(command.name) + ")\n      printf '%s\\n'";
    for (const CompletedOption& option : command.options) {
      for (const std::string& name : option.names) {
        cases += " \\\n        " + Quote(described ? name + ":" + option.description : name);
      }
    }
    cases += "\n      ;;\n";
  }
  return "_PROGRAM_options() {\n  case $1 in\n" + cases + "  esac\n}\n\n";
}

std::string CommandsFunction(const CompletedProgram& program, bool described) {
  std::string list;
  for (const CompletedCommand& command : program.commands) {
    if (command.name.empty()) continue;
    const std::string line = described ? command.name + ":" + command.description : command.name;
    list += " \\\n    " + Quote(line);
  }
  return "_PROGRAM_commands() {\n  " + (list.empty() ? ":" : "printf '%s\\n'" + list) + "\n}\n\n";
}

// Finds the sub-command, the option that waits for its value and the number of arguments before the
// cursor.
constexpr char kWalk[] = R"sh(
  for word in "${typed[@]}"; do
    if [[ -n $waiting ]]; then
      waiting=
    elif [[ $word == -*=* ]]; then
      :
    elif [[ $word == -* ]]; then
      if _PROGRAM_values "$command:$word" >/dev/null; then waiting=$word; fi
    elif [[ -z $command && -n $(_PROGRAM_commands) ]]; then
      command=$word
    else
      position=$((position + 1))
    fi
  done
)sh";

constexpr char kBashHead[] = R"sh(_PROGRAM() {
  local line=${COMP_LINE:0:COMP_POINT} whole='' prefix='' place='' command='' waiting='' word
  local values assigned='' base='' current cut position=0 reply
  local -a typed candidates
  COMPREPLY=()
  read -ra typed <<<"$line"
  if [[ $line != *[[:blank:]] ]]; then
    whole=${typed[-1]}
    unset 'typed[-1]'
  fi
  typed=("${typed[@]:1}"))sh";

// Readline takes the characters of COMP_WORDBREAKS for the ends of words, so what stands in
// front of the last one must not be in the candidates.
constexpr char kBashTail[] = R"sh(
  if [[ -n $waiting ]]; then
    place=$command:$waiting
  elif [[ $whole == --*=* ]]; then
    prefix=${whole%%=*}=
    place=$command:${whole%%=*}
  elif [[ $whole == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$(_PROGRAM_options "$command")" -- "$whole")
    return
  elif [[ -z $command && -n $(_PROGRAM_commands) ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$(_PROGRAM_commands)" -- "$whole")
    return
  else
    place=$command:$((position + 1))
    _PROGRAM_values "$place" >/dev/null || place=$command:more
  fi
  values=$(_PROGRAM_values "$place") || return 0
  current=${whole#"$prefix"}
  if [[ $values == @file ]]; then
    compopt -o filenames 2>/dev/null
    mapfile -t COMPREPLY < <(compgen -f -- "$current")
    return
  fi
  assigned=$(_PROGRAM_values "$place=")
  if [[ -n $assigned && $current == *=* ]]; then
    base=${current%=*}=
    values=$assigned
    assigned=
  elif [[ $current == *,* ]]; then
    base=${current%,*},
  fi
  mapfile -t candidates < <(compgen -W "$values" -- "${current#"$base"}")
  cut=${whole%"${whole##*[=:]}"}
  for word in "${candidates[@]}"; do
    reply=$prefix$base$word${assigned:+=}
    COMPREPLY+=("${reply#"$cut"}")
  done
  if [[ -n $assigned ]]; then compopt -o nospace 2>/dev/null; fi
}

complete -F _PROGRAM )sh";

constexpr char kZshHead[] = R"sh(_PROGRAM() {
  local place='' command='' waiting='' word values assigned position=0
  local -a typed list
  typed=("${(@)words[2,CURRENT-1]}"))sh";

constexpr char kZshTail[] = R"sh(
  if [[ -n $waiting ]]; then
    place=$command:$waiting
  elif [[ $PREFIX == --*=* ]]; then
    place=$command:${PREFIX%%=*}
    compset -P 1 '*='
  elif [[ $PREFIX == -* ]]; then
    list=("${(@f)$(_PROGRAM_options "$command")}")
    _describe -o option list
    return
  elif [[ -z $command && -n $(_PROGRAM_commands) ]]; then
    list=("${(@f)$(_PROGRAM_commands)}")
    _describe command list
    return
  else
    place=$command:$((position + 1))
    _PROGRAM_values "$place" >/dev/null || place=$command:more
  fi
  values=$(_PROGRAM_values "$place") || return 1
  if [[ $values == @file ]]; then
    _files
    return
  fi
  assigned=$(_PROGRAM_values "$place=")
  if [[ -n $assigned ]] && compset -P '*='; then
    compadd -- ${=assigned}
  elif [[ -n $assigned ]]; then
    compset -P '*,'
    compadd -S '=' -- ${=values}
  else
    compset -P '*,'
    compadd -- ${=values}
  fi
}

# As a file of $fpath this text is the function itself; it may be read by `source` too.
if [[ ${funcstack[1]-} == _PROGRAM ]]; then
  _PROGRAM "$@"
else
  compdef _PROGRAM )sh";

}  // namespace

std::string BashCompletion(const CompletedProgram& program) {
  const std::string script = "# Completion of " + program.name + " for bash.\n" +
                             ValuesFunction(program) + OptionsFunction(program, false) +
                             CommandsFunction(program, false) + kBashHead + kWalk + kBashTail;
  return ForProgram(script, program) + program.name + "\n";
}

std::string ZshCompletion(const CompletedProgram& program) {
  const std::string script = ValuesFunction(program) + OptionsFunction(program, true) +
                             CommandsFunction(program, true) + kZshHead + kWalk + kZshTail;
  return "#compdef " + program.name + "\n" + ForProgram(script, program) + program.name + "\nfi\n";
}
