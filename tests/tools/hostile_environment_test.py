"""The tools that root runs with the environment of somebody else."""

import os
import subprocess

import pytest

from log_help import LOG, line

pytestmark = pytest.mark.native

ODD = ["", "x" * 5000, "../../../../etc/passwd", "/dev/zero", "\x1b[2J", "%s%n", "-1", "xterm\n"]
NAMES = ["TERM", "TERMINFO", "TERMINFO_DIRS", "TERMCAP", "LANG", "LC_ALL", "LC_CTYPE", "HOME", "TZ"]
NAMES += ["COLUMNS", "LINES", "TMPDIR", "NO_COLOR", "LOCPATH", "NCURSES_NO_UTF8_ACS", "ESCDELAY"]

# A type of terminal whose every movement of the cursor is text that shows.
OWNED = """xterm-256color|of another user,
\tam, cols#80, lines#24, colors#8, pairs#64,
\tcup=OWNED%p1%d;%p2%d, clear=OWNED, el=OWNED, sgr0=OWNED, smcup=OWNED, rmcup=OWNED,
"""


@pytest.mark.parametrize("name", NAMES)
def test_no_value_of_a_variable_ends_a_tool_by_a_signal(run, name):
    LOG.write_text(line("text"))
    for value in ODD:
        environment = {name: value}
        for words in (["show"], ["status"], ["doctor", "--json"]) if value in ODD[:3] else (["show"],):
            done = run("twlogctl", *words, env=environment)
            assert done.returncode in (0, 1), (value, done.stderr)
            assert "\x1b" not in done.stderr
        done = run("twcamsim", "-e", "json", "--for", "1ms", env=environment)
        assert done.returncode == 0, (value, done.stderr)


def test_a_directory_for_temporary_files_that_is_missing_is_named(run):
    done = run("twcamsim", "-e", "json,tls", "--for", "1ms", env={"TMPDIR": "/no/such"})
    assert (done.returncode, done.stdout) == (1, "")
    assert "TMPDIR" in done.stderr
    assert not [name for name in os.listdir("/") if name.startswith("twcamsim")]


@pytest.fixture
def owned(tmp_path):
    """A directory of terminal descriptions that another user wrote."""
    directory = tmp_path / ".terminfo"
    directory.mkdir()
    source = tmp_path / "owned.ti"
    source.write_text(OWNED)
    subprocess.run(["tic", "-x", "-o", directory, source], check=True, capture_output=True)
    tmp_path.chmod(0o755)
    return directory


@pytest.mark.parametrize("name", ["TERMINFO", "TERMINFO_DIRS", "HOME"])
def test_for_root_a_terminal_is_what_the_system_says(spawn, owned, name):
    if os.geteuid() != 0:
        pytest.skip("only root's descriptions are the system's alone")
    value = owned.parent if name == "HOME" else owned
    child = spawn("twlogctl", "top", env={name: str(value), "TERM": "xterm-256color"})
    child.expect("leave")
    assert "OWNED" not in child.before
    child.send("q")
    assert "OWNED" not in child.read()


@pytest.mark.parametrize("terminal", ["dumb", "no-such-terminal", "../x", "x" * 3000])
def test_top_refuses_a_terminal_on_which_nothing_can_be_drawn(spawn, terminal):
    child = spawn("twlogctl", "top", env={"TERM": terminal})
    assert "top does not know this terminal" in child.read()
    child.close()
    assert child.exitstatus == 1
