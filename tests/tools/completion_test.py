"""The completion scripts of the tools, in the shells themselves."""

import os
import shlex
import shutil
import subprocess

import pexpect
import pytest

from conftest import HANG

pytestmark = pytest.mark.native

CATEGORIES = 74
LEVELS = ["alarm", "error", "warn", "notice", "info", "debug", "debug2", "debug3"]
SHELLS = ("bash", "zsh", "fish")

# What follows the last blank of a line, and what it may become.
CASES = {
    "twlogctl st": {"status", "stats"},
    "twlogctl --comp": {"--completion"},
    "twlogctl --completion z": {"zsh"},
    "twlogctl set --f": {"--for"},
    "twlogctl set --for 1": {"10m", "1h"},
    "twlogctl set htt": {"http="},
    "twlogctl set http=debug": {"http=debug", "http=debug2", "http=debug3"},
    "twlogctl set http=w": {"http=warn"},
    "twlogctl set http,sock": {"http,socket="},
    "twlogctl set http,socket=al": {"http,socket=alarm"},
    "twlogctl set http=debug util": {"utils="},
    "twlogctl set --for 10m rts": {"rtsp="},
    "twlogctl set --json al": {"all="},
    "twlogctl timescale o": {"on", "off"},
    "twlogctl write --category htt": {"http"},
    "twlogctl write -c htt": {"http"},
    "twlogctl write --level=war": {"--level=warn"},
    "twlogctl write -c http -l inf": {"info"},
    "twlogctl follow -c http,sock": {"http,socket"},
    "twlogctl follow --lev": {"--level"},
    "twlogctl show -l al": {"alarm"},
}


@pytest.fixture(scope="session")
def scripts(run, tmp_path_factory):
    """The directory of the scripts, each under the name by which its shell finds it."""
    directory = tmp_path_factory.mktemp("completion")
    for shell, name in (("bash", "twlogctl"), ("zsh", "_twlogctl"), ("fish", "twlogctl.fish")):
        result = run("twlogctl", "--completion", shell)
        assert result.returncode == 0
        (directory / shell).mkdir()
        (directory / shell / name).write_text(result.stdout)
    return directory


@pytest.fixture(autouse=True)
def tool_on_path(command, tmp_path, monkeypatch):
    """The scripts ask the tool that PATH leads to."""
    directory = tmp_path / "bin"
    directory.mkdir()
    program = directory / "twlogctl"
    program.write_text(f'#!/bin/sh\nexec {shlex.join(command("twlogctl"))} "$@"\n')
    program.chmod(0o755)
    monkeypatch.setenv("PATH", f"{directory}:{os.environ['PATH']}")


def need(shell):
    if not shutil.which(shell):
        pytest.skip(f"{shell} is missing")


def lines_of(words, **options):
    result = subprocess.run(words, capture_output=True, text=True, timeout=HANG, **options)
    assert result.returncode == 0, result.stderr
    assert result.stderr == ""
    return result.stdout.splitlines()


# Calls the completion as readline does, and joins what it cuts off at its word breaks.
BASH = """
source "$1"
COMP_LINE=$2 COMP_POINT=${#2}
_twlogctl
whole=${2##* }
for candidate in "${COMPREPLY[@]}"; do
  printf '%s\\n' "${whole%"${whole##*[=:]}"}$candidate"
done
"""


@pytest.mark.parametrize("line", CASES)
def test_bash_completes(scripts, line):
    words = ["bash", "--norc", "-uc", BASH, "bash", scripts / "bash/twlogctl", line]
    assert set(lines_of(words)) == CASES[line]


def test_bash_offers_everything_for_nothing_typed(scripts):
    def offered(line):
        return lines_of(["bash", "-uc", BASH, "bash", scripts / "bash/twlogctl", line])

    assert {"status", "set", "follow", "show", "top", "doctor"} <= set(offered("twlogctl "))
    assert len(offered("twlogctl write -c ")) == CATEGORIES
    assert offered("twlogctl write -l ") == LEVELS
    assert len(offered("twlogctl set ")) == CATEGORIES + 1
    assert offered("twlogctl timescale on ") == []
    assert offered("twlogctl create --group ") == []


def test_a_file_is_completed_from_what_is_there(scripts, tmp_path):
    need("fish")
    (tmp_path / "some.log").touch()
    (tmp_path / "other.log").touch()
    line = f"twlogctl show --file {tmp_path}/so"
    bash = ["bash", "-uc", BASH, "bash", scripts / "bash/twlogctl", line]
    code = f"source {scripts}/fish/twlogctl.fish; complete -C '{line}'"
    fish = ["fish", "--no-config", "-c", code]
    for words in (bash, fish):
        assert lines_of(words) == [f"{tmp_path}/some.log"]


def test_bash_completes_at_its_prompt(scripts):
    words = ["--norc", "--noprofile"]
    shell = pexpect.spawn("bash", words, encoding="utf-8", timeout=HANG)
    shell.sendline(f"twlogctl() {{ echo \"<$*>\"; }}; source {scripts}/bash/twlogctl; echo re''ady")
    shell.expect_exact("ready")
    shell.send("twlogctl se\tht\tdebug3 sock\tal\t\r")
    shell.expect_exact("<set http=debug3 socket=alarm>")
    shell.close(force=True)


def test_zsh_takes_the_script(scripts):
    need("zsh")
    assert lines_of(["zsh", "-n", scripts / "zsh/_twlogctl"]) == []


# A shell inside the shell, in a pseudo-terminal: its completion lists each candidate between marks.
ZSH = r"""
zmodload zsh/zpty
zpty inner zsh -f -i
zpty -w inner 'PS1=; unsetopt zle_bracketed_paste; unset zle_bracketed_paste'
zpty -w inner "fpath=($1 \$fpath); autoload -Uz compinit; compinit -u -D"
zpty -w inner 'compadd() {
  if [[ ${@[1,(i)(-|--)]} == *-(O|A|D)\ * ]]; then builtin compadd "$@"; return; fi
  local -a found; local suffix; local -i at=${@[(i)-S]}
  builtin compadd -A found "$@"
  (( at < $# )) && suffix=${@[at+1]}
  print -rl -- "<"${^found}${suffix%% }">"
}'
zpty -w inner 'bindkey "^I" complete-word; zle -C complete-word complete-word _main_complete'
# Said by the line editor: what it is sent earlier the terminal would take for plain lines.
zpty -w inner 'zle-line-init() { print -r -- re""ady }; zle -N zle-line-init'
while zpty -r inner line; do [[ $line == *ready* ]] && break; done
zpty -w -n inner "$2"$'\t\C-u print -r -- e""nd\n'
while zpty -r inner line; do
  [[ $line == *end* ]] && break
  print -r -- "$line"
done
zpty -d inner
"""


@pytest.mark.parametrize("line", CASES)
def test_zsh_completes(scripts, line):
    need("zsh")
    words = ["zsh", "-fc", ZSH, "zsh", scripts / "zsh", line]
    output = subprocess.run(words, capture_output=True, text=True, timeout=HANG, check=False).stdout
    assert zsh_candidates(output, line) == CASES[line], output


def zsh_candidates(output, line):
    """What was offered; the part that a prefix of the word stood for is put in front again."""
    offered = {part.split(">")[0] for part in output.split("<")[1:]}
    whole = line.split(" ")[-1]
    cut = max(whole.rfind("="), whole.rfind(",")) + 1
    return {whole[:cut] + word for word in offered}


@pytest.mark.parametrize("line", CASES)
def test_fish_completes(scripts, line, tmp_path):
    need("fish")
    code = f"source {scripts}/fish/twlogctl.fish; complete -C '{line}'"
    lines = lines_of(["fish", "--no-config", "-c", code], env={**os.environ, "HOME": str(tmp_path)})
    assert {text.split("\t")[0] for text in lines} == CASES[line]


def test_fish_takes_the_script(scripts):
    need("fish")
    assert lines_of(["fish", "--no-execute", scripts / "fish/twlogctl.fish"]) == []


@pytest.mark.parametrize("shell", ["", "tcsh", "BASH"])
def test_another_shell_is_wrong_usage(run, shell):
    result = run("twlogctl", f"--completion={shell}")
    assert result.returncode == 2
    assert "--completion" in result.stderr
    assert result.stdout == ""
