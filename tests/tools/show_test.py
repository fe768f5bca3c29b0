"""twlogctl show."""

import json
import os
import subprocess
import time

import pytest

from conftest import HANG, LOG_DIRECTORY, plain_environment
from log_help import LOG, line, run_plain, without_privileges


def shown(run, *args, log=LOG):
    result = run("twlogctl", "show", *args)
    assert result.returncode == 0, result.stderr
    return result.stdout


def stamped(seconds_ago, text, milliseconds=""):
    moment = time.localtime(time.time() - seconds_ago)
    return line(text, stamp=time.strftime("%b %e %T", moment) + milliseconds)


def test_a_log_is_shown_byte_for_byte_in_a_pipe(run):
    text = line("one \x1b[31mred\x07 \\n") + line("two\nlines") + line("last").rstrip("\n")
    LOG.write_text(text)
    assert shown(run) == text


def test_a_line_of_the_library_is_taken_apart(run):
    assert run("twlogctl", "write", "-c", "http", "-l", "warn", "no answer").returncode == 0
    record = json.loads(shown(run, "--json"))
    assert record["category"] == "http"
    assert record["level"] == "warn"
    assert record["message"] == "no answer"
    assert record["pid"] == record["tid"] > 0
    written = time.mktime(time.strptime(record["time"][:19], "%Y-%m-%dT%H:%M:%S"))
    assert abs(time.time() - written) < 600


def test_every_field_of_a_line_has_its_place_in_json(run):
    LOG.write_text(line("text", "Mar  5 14:03:09.250", "812][840"))
    os.utime(LOG, (1772718000, 1772718000))  # on the fifth of March 2026
    record = json.loads(shown(run, "--json"))
    assert record.pop("time").startswith("2026-03-05T14:03:09.250")
    assert record == {
        "pid": 812,
        "tid": 840,
        "category": "camera",
        "level": "warn",
        "file": "camerad",
        "line": 57,
        "function": "Probe",
        "message": "text",
    }


@pytest.mark.parametrize(
    "text, expected",
    [
        (line("x", tags=""), {"category": None, "level": None, "pid": 812, "tid": 812}),
        (line("x", "", "7][9", ""), {"time": None, "pid": 7, "tid": 9, "category": None}),
        ("Mar  5 14:03:09 [8] a:b:-3:C::D(): x\n", {"file": "a:b", "line": -3, "function": "C::D"}),
        ("Mar  5 14:03:09 [8] :0:(): \n", {"file": "", "function": "", "message": ""}),
        ("Mär  5 14:03:09 [8] a:1:f(): x\n", {"time": None, "pid": 8, "message": "x"}),
        (line("a(): b"), {"function": "Probe", "message": "a(): b"}),
    ],
)
def test_unusual_lines_are_taken_apart(run, text, expected):
    LOG.write_text(text)
    record = json.loads(shown(run, "--json"))
    assert {name: record[name] for name in expected} == expected


@pytest.mark.parametrize(
    "text",
    [
        "Mar  5 14:03:09 text\n",
        "Mar  5 14:03 [812] a:1:f(): x\n",
        "Mar 45 14:03:09 [812] a:1:f(): x\n",
        "Mar  5 14:03:09 [x] a:1:f(): x\n",
        "Mar  5 14:03:09 [812 a:1:f(): x\n",
        "Mar  5 14:03:09 [812] a:f(): x\n",
        "Mar  5 14:03:09 [812] a:1:f\n",
        "\n",
    ],
)
def test_what_only_looks_like_a_prefix_belongs_to_the_message_before(run, text):
    LOG.write_text(line("head") + text)
    records = [json.loads(record) for record in shown(run, "--json").splitlines()]
    assert [record["message"] for record in records] == ["head\n" + text.rstrip("\n")]


def test_lines_in_front_of_the_first_message_have_no_fields(run):
    LOG.write_text("rest of a line\n" + line("first"))
    records = [json.loads(record) for record in shown(run, "--json").splitlines()]
    assert [record["message"] for record in records] == ["rest of a line", "first"]
    assert records[0]["pid"] is None and records[0]["time"] is None


def test_bytes_that_are_no_text_are_replaced_in_json(run):
    LOG.write_bytes(line("a").encode().replace(b"): a", b"): \xff\x00\x80"))
    assert json.loads(shown(run, "--json"))["message"] == "\ufffd\0\ufffd"


def test_continuation_lines_share_the_fate_of_their_message(run):
    wanted = line("head\nbody\n\nend", tags="[http][error]")
    LOG.write_text(line("other\nbody") + wanted + line("other"))
    assert shown(run, "-c", "http") == wanted
    assert shown(run, "-g", "body", "-l", "error") == wanted


def test_categories_are_chosen_by_name_and_number(run):
    lines = {name: line(name, tags=f"[{name}][warn]") for name in ("http", "socket", "camera")}
    LOG.write_text("".join(lines.values()) + line("bare", tags=""))
    assert shown(run, "-c", "http") == lines["http"]
    assert shown(run, "-c", "HTTP,57") == lines["http"] + lines["socket"]
    assert shown(run, "-c", "http", "-c", "camera") == lines["http"] + lines["camera"]


def test_a_level_takes_the_more_severe_ones_along(run):
    names = ("alarm", "error", "warn", "notice", "info", "debug", "debug2", "debug3")
    lines = [line(name, tags=f"[http][{name}]") for name in names]
    LOG.write_text("".join(lines) + line("bare", tags=""))
    for number, name in enumerate(names):
        assert shown(run, "-l", name) == "".join(lines[: number + 1])
    assert shown(run, "-l", "2") == "".join(lines[:3])


def test_processes_are_chosen_by_their_numbers(run):
    lines = [line("x", pid=str(pid)) for pid in (1, 12, 123)]
    LOG.write_text("".join(lines))
    assert shown(run, "-p", "12") == lines[1]
    assert shown(run, "-p", "1,123") == lines[0] + lines[2]


def test_text_is_plain_unless_it_is_to_be_a_pattern(run):
    plain, other = line("a.c (1)"), line("abc 1")
    LOG.write_text(plain + other)
    assert shown(run, "-g", "a.c") == plain
    assert shown(run, "-g", "(1)") == plain
    assert shown(run, "-g", "a.c", "--regex") == plain + other
    assert shown(run, "-g", "a.c 1$|nothing", "--regex") == other
    assert shown(run, "-g", "camerad:57") == plain + other


def test_the_last_messages_are_counted_after_choosing(run):
    lines = [
        line(str(number), tags=f"[http][{level}]")
        for number in range(20)
        for level in ("warn", "info")
    ]
    LOG.write_text("".join(lines))
    assert shown(run, "-n", "3") == "".join(lines[-3:])
    assert shown(run, "-l", "warn", "-n", "2") == lines[-4] + lines[-2]
    assert run("twlogctl", "show", "-n", "0").returncode == 1


def test_spans_count_back_from_the_present(run):
    old, new = stamped(7200, "old"), stamped(1800, "new")
    LOG.write_text(old + new)
    assert shown(run, "--since", "1h") == new
    assert shown(run, "--until", "1h") == old
    assert shown(run, "--since", "2.5h", "--until", "90m") == old


def test_times_are_taken_with_and_without_a_date(run):
    lines = {hour: line(hour, f"Mar  5 {hour}") for hour in ("13:59:59", "14:00:00", "14:00:30")}
    LOG.write_text("".join(lines.values()))
    os.utime(LOG, (1772900000, 1772900000))  # in March 2026
    late = lines["14:00:00"] + lines["14:00:30"]
    assert shown(run, "--since", "2026-03-05 14:00") == late
    assert shown(run, "--since", "2026-03-05T14:00:01") == lines["14:00:30"]
    assert shown(run, "--until", "2026-03-05 14:00:00") == lines["13:59:59"]
    assert shown(run, "--since", "2026-03-05", "--until", "2026-03-06") == "".join(lines.values())


def test_a_time_without_a_date_is_the_last_one_that_has_passed(run):
    LOG.write_text(stamped(3600, "recent") + stamped(25 * 3600, "yesterday"))
    clock = time.strftime("%H:%M:%S", time.localtime(time.time() - 7200))
    assert "recent" in shown(run, "--since", clock)
    ahead = time.strftime("%H:%M:%S", time.localtime(time.time() + 3600))
    assert shown(run, "--since", ahead).count("\n") == 1  # that of yesterday, 23 hours ago


def test_lines_of_december_that_are_read_in_january_are_of_the_year_before(run):
    LOG.write_text(line("old", "Dec 31 23:59:59") + line("new", "Jan  1 00:00:01"))
    turn = time.mktime((2026, 1, 1, 0, 0, 1, 0, 0, -1))
    os.utime(LOG, (turn, turn))
    records = [json.loads(record) for record in shown(run, "--json").splitlines()]
    assert [record["time"][:10] for record in records] == ["2025-12-31", "2026-01-01"]


def test_a_leap_day_is_of_the_last_leap_year(run):
    LOG.write_text(line("x", "Feb 29 12:00:00"))
    changed = time.mktime((2026, 3, 5, 0, 0, 0, 0, 0, -1))
    os.utime(LOG, (changed, changed))
    assert json.loads(shown(run, "--json"))["time"].startswith("2024-02-29T12:00:00")


def test_the_notification_log_is_a_log_of_its_own(run):
    LOG.write_text(line("main"))
    (LOG_DIRECTORY / "twnotification.log").write_text(line("notification"))
    assert shown(run, "--notification") == line("notification")


def test_a_copied_log_and_standard_input_can_be_read(run, tmp_path):
    copy = tmp_path / "copied.log"
    copy.write_text(line("copied"))
    assert shown(run, "--file", copy) == line("copied")
    result = run("twlogctl", "show", "--file", "-", input=line("piped"))
    assert (result.returncode, result.stdout) == (0, line("piped"))


def test_a_terminal_gets_colours_and_no_control_bytes(spawn):
    plain = line("b", tags="[http][notice]")
    LOG.write_text(line("a \x1b[2J\x07 \\ \u009b", tags="[http][error]") + plain)
    output = spawn("twlogctl", "show").read()
    first, second = output.splitlines()
    assert first.startswith("\x1b[31mMar") and first.endswith("\x1b[0m")
    assert r"a \x1B[2J\x07 \\ \xC2\x9B" in first
    assert second == plain.rstrip("\n")


@pytest.mark.parametrize("environment", [{"NO_COLOR": "1"}, {"TERM": "dumb"}])
def test_colours_can_be_refused(spawn, environment):
    LOG.write_text(line("\x1b", tags="[http][error]"))
    output = spawn("twlogctl", "show", env=environment).read()
    assert "\x1b" not in output and r"\x1B" in output


def test_a_message_longer_than_any_buffer_is_shown_whole(run):
    text = line("x" * 3_000_000 + "\n" + "y" * 70_000)
    LOG.write_text(text)
    assert shown(run) == text


def test_no_match_is_a_result(run):
    LOG.write_text(line("x"))
    result = run("twlogctl", "show", "-g", "nothing")
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"twlogctl: {LOG}: no message matches\n"


def test_a_missing_log_is_named(run):
    result = run("twlogctl", "show")
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"twlogctl: {LOG}: No such file or directory\n"


def test_a_directory_is_no_log(run, tmp_path):
    result = run("twlogctl", "show", "--file", tmp_path)
    assert (result.returncode, result.stderr) == (1, f"twlogctl: {tmp_path}: Is a directory\n")


def test_a_log_without_permission_is_named(command):
    LOG.write_text(line("secret"))
    LOG.chmod(0)
    result = run_plain(without_privileges(command("twlogctl", "show")))
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"twlogctl: {LOG}: Permission denied\n"


@pytest.mark.parametrize(
    "args, phrase",
    [
        (["-c", "htpt"], "did you mean http?"),
        (["-c", "74"], 'unknown category "74"'),
        (["-l", "wran"], "did you mean warn"),
        (["-l", "8"], 'unknown level "8"'),
        (["-p", "x"], '"x" is no whole number'),
        (["-p", "-1"], "no whole number"),
        (["-n", "-1"], "no whole number"),
        (["-n", "many"], "no whole number"),
        (["-g", "(", "--regex"], "Unmatched ("),
        (["--regex"], "--regex"),
        (["--since", "yesterday"], "neither a time"),
        (["--since", "2026-02-30"], "neither a time"),
        (["--until", "25:00"], "neither a time"),
        (["--since", "1h", "--until", "2h"], "not later than --since"),
        (["--file", "x", "--notification"], "excludes"),
        (["--unknown"], "--unknown"),
        (["http"], "http"),
    ],
)
def test_wrong_arguments_are_explained(run, args, phrase):
    LOG.write_text(line("x"))
    result = run("twlogctl", "show", *args)
    assert (result.returncode, result.stdout) == (2, "")
    assert phrase in result.stderr


def test_an_option_without_its_value_is_wrong_usage(run):
    for option in ("-c", "-l", "-p", "-g", "-n", "--since", "--until", "--file"):
        assert run("twlogctl", "show", option).returncode == 2, option


def test_a_reader_that_goes_ends_it_as_the_signal_does(command):
    LOG.write_text(line("x" * 1000) * 1000)
    child = subprocess.Popen(
        command("twlogctl", "show"), stdout=subprocess.PIPE, env=plain_environment()
    )
    child.stdout.read(10)
    child.stdout.close()
    assert child.wait(timeout=HANG) == -13


def test_a_full_disk_at_standard_output_is_reported(command):
    LOG.write_text(line("x"))
    with open("/dev/full", "w", encoding="ascii") as full:
        words = command("twlogctl", "show")
        result = subprocess.run(
            words, stdout=full, stderr=subprocess.PIPE, timeout=HANG, check=False
        )
    assert (result.returncode, result.stderr) == (1, b"twlogctl: cannot write the output\n")
