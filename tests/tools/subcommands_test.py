"""What every sub-command of twlogctl has in common."""

import os
import re
import signal
import subprocess

import pytest

pytestmark = pytest.mark.native


COMMANDS = (
    "status create remove set timescale save load diff follow show stats top write doctor".split()
)


@pytest.mark.parametrize("name", COMMANDS)
def test_each_sub_command_explains_itself(ctl, name):
    result = ctl(name, "--help")
    assert result.returncode == 0
    assert f"Usage: twlogctl {name}" in result.stdout
    assert result.stderr == ""


@pytest.mark.parametrize("name", COMMANDS)
def test_an_unknown_option_is_wrong_usage(ctl, name):
    result = ctl(name, "--no-such-option")
    assert result.returncode == 2
    assert result.stdout == ""
    assert result.stderr.startswith("twlogctl: ")
    assert f'try "twlogctl {name} --help"' in result.stderr


def test_without_a_sub_command_it_is_wrong_usage(ctl):
    assert ctl().returncode == 2


def test_an_unknown_sub_command_names_the_nearest_one(ctl):
    result = ctl("doctro")
    assert result.returncode == 2
    assert 'unknown sub-command "doctro" (did you mean doctor?)' in result.stderr


def test_help_lists_every_sub_command_and_the_exit_codes(ctl):
    text = ctl("--help").stdout
    for name in COMMANDS:
        assert re.search(rf"^  {name} ", text, re.MULTILINE), name
    assert "Exit codes: 0 " in text


def test_a_reader_that_is_gone_ends_it_as_sigpipe_does(command, record):
    read_end, write_end = os.pipe()
    os.close(read_end)
    with os.fdopen(write_end, "wb") as gone:
        child = subprocess.run(
            command("twlogctl", "status", "--all"),
            stdout=gone,
            stderr=subprocess.PIPE,
            timeout=120,
            check=False,
        )
    assert child.returncode == -signal.SIGPIPE
    assert child.stderr == b""


def test_output_that_cannot_be_written_is_a_failure(command, record):
    with open("/dev/full", "wb") as full:
        child = subprocess.run(
            command("twlogctl", "status"),
            stdout=full,
            stderr=subprocess.PIPE,
            text=True,
            timeout=120,
            check=False,
        )
    assert child.returncode == 1
    assert "twlogctl: cannot write the output" in child.stderr
