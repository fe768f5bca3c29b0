"""What the tools share, as it shows in them: names, spans, sizes, escapes, colours and JSON."""

import json
import os
import re
import shutil
import signal
import subprocess

import pytest

from conftest import HANG, LOG_DIRECTORY, ROOT, SETTINGS_DIRECTORY, TOOLS

SETTINGS = SETTINGS_DIRECTORY / "settings.conf"


# Versions


@pytest.mark.parametrize("tool", TOOLS)
def test_the_version_is_that_of_the_header(run, tool):
    header = (ROOT / "tarnwick" / "version.h").read_text()
    parts = re.findall(r"^#define TARNWICK_VERSION_(?:MAJOR|MINOR|PATCH) (\d+)$", header, re.MULTILINE)
    result = run(tool, "--version")
    assert (result.returncode, result.stdout) == (0, f"{tool} {'.'.join(parts)}\n")


# Names


def test_every_category_is_found_by_its_name_and_by_its_number(ctl, record):
    names = list(json.loads(ctl("status", "--all", "--json").stdout)["levels"])
    assert len(names) == 74
    assert ctl("set", *[f"{name.upper()}=debug" for name in names]).returncode == 0
    assert record.levels() == [5] * 74
    assert ctl("set", *[f"{number}={number % 8}" for number in range(74)]).returncode == 0
    assert record.levels() == [number % 8 for number in range(74)]


@pytest.mark.parametrize(
    ("typed", "suggestion"),
    [
        ("htpt", " (did you mean http?)"),  # two letters swapped
        ("sokcet", " (did you mean socket?)"),
        ("HTTPS", " (did you mean http?)"),
        ("camer", " (did you mean camera, camerad?)"),
        ("notifid", " (did you mean notifyd, notify?)"),
        ("recrd-api", " (did you mean record-api"),
        ("zzzzzzzz", ""),
        ("x" * 5000, ""),
        ("ht\xfftp", " (did you mean http?)"),
    ],
)
def test_the_nearest_names_are_offered_and_far_ones_are_not(ctl, typed, suggestion):
    complaint = ctl("set", f"{typed}=debug").stderr.splitlines()[0]
    assert complaint.startswith(f'twlogctl: unknown category "{typed}"{suggestion}')
    assert suggestion or complaint.endswith('"')


def test_no_more_than_three_names_are_offered(ctl):
    complaint = ctl("set", "camera-x=debug").stderr.splitlines()[0]
    offered = re.search(r"did you mean (.*)\?", complaint)[1].split(", ")
    assert len(offered) == 3
    assert set(offered) <= {"camera", "camera-api", "camera-cfg", "camera-lib", "camerad"}


# Spans and sizes


@pytest.mark.parametrize(
    ("typed", "told"),
    [
        ("90", "1 min 30 s"),
        ("90s", "1 min 30 s"),
        ("12.5", "12.5 s"),
        ("59999ms", "59.9 s"),
        ("900000ms", "15 min"),
        ("10m", "10 min"),
        ("10min", "10 min"),
        ("1.5h", "1 h 30 min"),
        ("25h", "1 d 1 h"),
        ("2d", "2 d"),
    ],
)
def test_a_span_is_told_by_its_two_largest_units(start, record, typed, told):
    child = start("twlogctl", "set", "http=debug", f"--for={typed}")
    assert child.stderr.readline().startswith(f"twlogctl: for {told}, until ")
    child.send_signal(signal.SIGTERM)
    child.wait(timeout=HANG)


@pytest.mark.parametrize(
    ("size", "told"),
    [
        (0, "0 B"),
        (1023, "1023 B"),
        (1024, "1.0 KiB"),
        (1536, "1.5 KiB"),
        ((1 << 20) - 1, "1.0 MiB"),
        (5 << 30, "5.0 GiB"),
        (3 << 40, "3.0 TiB"),
    ],
)
def test_a_size_has_the_unit_that_fits(ctl, size, told):
    with open(LOG_DIRECTORY / "tarnwick.log", "wb") as log:
        log.truncate(size)
    findings = map(json.loads, ctl("doctor", "--json").stdout.splitlines())
    assert [f["text"] for f in findings if f["check"] == "file"][0].endswith(f", {told}")


# Escapes


@pytest.mark.parametrize(
    ("sent", "shown"),
    [
        (b"\x1b[2J", r"\x1B[2J"),
        (b"a\tb\rc", r"a\tb\rc"),
        (b"a\\b", r"a\\b"),
        (b"\x00\x07\x7f", r"\x00\x07\x7F"),
        ("grün €𝄞".encode(), "grün €𝄞"),
        (b"\xc2\x9b2J", r"\xC2\x9B2J"),  # a control sequence of one character
        (b"\xff\xfe", r"\xFF\xFE"),
        (b"\xc0\xaf", r"\xC0\xAF"),  # overlong
        (b"\xed\xa0\x80", r"\xED\xA0\x80"),  # half a surrogate pair
        (b"\xf4\x90\x80\x80", r"\xF4\x90\x80\x80"),  # beyond the last character
        (b"\xe2\x82", r"\xE2\x82"),  # cut
        (b"\xe2\x82\xe2\x82\xac", r"\xE2\x82€"),  # cut, and whole
    ],
)
def test_what_is_no_text_is_shown_as_its_bytes(ctl, record, sent, shown):
    SETTINGS.write_bytes(b'tw_dbglog_settings="' + sent + b'"\ntw_dbglog_time_scale="no"\n')
    assert f': "{shown}" is no level' in ctl("load").stderr


# Colours


@pytest.mark.parametrize(
    ("environment", "coloured"),
    [
        ({}, True),
        ({"NO_COLOR": ""}, True),
        ({"NO_COLOR": "0"}, False),
        ({"TERM": "dumb"}, False),
        ({"TERM": ""}, False),
    ],
)
def test_colours_are_for_terminals_that_take_them(spawn, record, environment, coloured):
    record.set_level(26, 5)
    text = spawn("twlogctl", "status", env=environment).read()
    assert ("\x1b[33mdebug\x1b[0m" in text) == coloured
    assert ("\x1b" in text) == coloured


# JSON


def test_names_that_are_no_text_are_replaced_in_json(ctl, record):
    own_name = b'a"\xff\n\xc3\xa9\\'
    with record.attached():
        with open("/proc/self/comm", "r+b") as comm:
            before = comm.read()
            comm.write(own_name)
        try:
            output = ctl("status", "--json").stdout
        finally:
            with open("/proc/self/comm", "wb") as comm:
                comm.write(before.rstrip(b"\n"))
    assert output.count("\n") == 1
    assert " " not in output
    names = [process["name"] for process in json.loads(output)["processes"]]
    assert names == ['a"\ufffd\n\u00e9\\']


# The tools' common manners


@pytest.mark.parametrize("tool", TOOLS)
def test_help_goes_to_standard_output_and_mistakes_to_standard_error(tools, run, tool):
    if not os.path.exists(tools[tool]):
        pytest.skip(f"{tool} is not built")
    result = run(tool, "--help")
    assert (result.returncode, result.stderr) == (0, "")
    assert result.stdout
    result = run(tool, "--no-such-option")
    assert result.returncode == 2
    assert result.stdout == ""
    assert result.stderr.startswith(f"{tool}: ")


@pytest.mark.parametrize("shell", ["bash", "zsh", "fish"])
@pytest.mark.parametrize("tool", TOOLS)
def test_every_completion_script_is_one_for_its_shell(tools, run, tmp_path, tool, shell):
    if not os.path.exists(tools[tool]) or not shutil.which(shell):
        pytest.skip(f"{tool} or {shell} is missing")
    result = run(tool, "--completion", shell)
    assert result.returncode == 0
    script = tmp_path / "script"
    script.write_text(result.stdout)
    checked = subprocess.run([shell, "-n", script], capture_output=True, text=True, check=False)
    assert (checked.returncode, checked.stderr) == (0, "")


@pytest.mark.parametrize("tool", TOOLS)
def test_every_manual_page_is_free_of_faults(tool):
    page = ROOT / f"tools/{tool}/{tool}.1"
    if not page.exists() or not shutil.which("mandoc"):
        pytest.skip(f"{page} or mandoc is missing")
    words = ["mandoc", "-T", "lint", page]
    checked = subprocess.run(words, capture_output=True, text=True, check=False)
    # That pages are missing which this one names is the machine's fault.
    faults = [line for line in checked.stdout.splitlines() if str(page) in line]
    assert [line for line in faults if "referenced manual not found" not in line] == []
