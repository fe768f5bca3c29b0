"""twlogctl stats."""

import json
import os
import re
import subprocess
import time

import pytest

from conftest import HANG, plain_environment
from log_help import LOG, Output, Screen, line, run_plain, without_privileges

# 14:03:00 on the fifth of March 2026, and ten seconds of log before it.
END = time.mktime((2026, 3, 5, 14, 3, 0, 0, 0, -1))


def write_known_log():
    """Ten seconds: 20 lines of http and 5 of socket, of them 5 warnings; one of no name."""
    lines = []
    for second in range(10):
        stamp = f"Mar  5 14:02:{50 + second}"
        lines += 2 * [line("x" * 20, stamp, "11", "[http][debug]")]
        if second % 2 == 0:
            lines.append(line("slow", stamp, "12", "[socket][warn]"))
    lines.append(line("bare", "Mar  5 14:02:59", "12", ""))
    LOG.write_text("".join(lines))
    os.utime(LOG, (END, END))
    return lines


def counted(run, *args):
    result = run("twlogctl", "stats", "--json", *args)
    assert result.returncode == 0, result.stderr
    return [json.loads(record) for record in result.stdout.splitlines()]


def named(records, kind):
    return {record["name"]: record["lines"] for record in records if record["by"] == kind}


def now_line(text, tags="[http][debug]"):
    return line(text, time.strftime("%b %e %T"), tags=tags)


def test_lines_and_bytes_are_counted_by_category_level_and_process(run):
    lines = write_known_log()
    records = counted(run)
    assert records[0]["by"] == "all"
    assert records[0]["lines"] == 26 and records[0]["bytes"] == sum(map(len, lines))
    assert named(records, "category") == {"http": 20, "socket": 5, None: 1}
    assert named(records, "level") == {"debug": 20, "warn": 5, None: 1}
    assert named(records, "process") == {"11": 20, "12": 6}


def test_rates_are_those_of_the_log_s_own_span(run):
    write_known_log()
    total = counted(run)[0]
    assert (total["seconds"], total["lines_per_second"]) == (10, 2.6)
    assert total["since"].startswith("2026-03-05T14:02:50.000")
    assert total["until"].startswith("2026-03-05T14:03:00.000")


def test_rates_are_those_of_the_span_that_is_asked_for(run):
    write_known_log()
    records = counted(run, "--since", "2026-03-05 14:02:55", "--until", "2026-03-05 14:03:15")
    assert (records[0]["seconds"], records[0]["lines"]) == (20, 13)
    assert records[0]["lines_per_second"] == 13 / 20
    assert named(records, "category") == {"http": 10, "socket": 2, None: 1}


def test_the_loudest_come_first(run):
    write_known_log()
    assert [record["name"] for record in counted(run)[1:4]] == ["http", "socket", None]
    text = run("twlogctl", "stats").stdout
    assert text.index("\nhttp ") < text.index("\nsocket ") < text.index("\n(no name) ")


def test_continuation_lines_count_for_their_message(run):
    LOG.write_text(line("head\nbody\nend", tags="[http][warn]"))
    assert named(counted(run), "category") == {"http": 3}


def test_messages_are_chosen_before_they_are_counted(run):
    write_known_log()
    assert named(counted(run, "-c", "socket"), "category") == {"socket": 5}
    assert named(counted(run, "-l", "warn"), "level") == {"warn": 5}


def test_a_table_holds_as_many_as_are_asked_for(run):
    write_known_log()
    lines = run("twlogctl", "stats", "-n", "1").stdout.splitlines()
    assert [text.split()[0] for text in lines[2:9]] == [
        "all", "category", "http", "level", "debug", "process", "11"
    ]  # fmt: skip


def test_a_row_has_lines_and_rates(run):
    lines = write_known_log()
    loudest = 2 * len(lines[0])  # two a second
    row = next(text for text in run("twlogctl", "stats").stdout.splitlines() if "http" in text)
    assert row.split()[:5] == ["http", "20", "2.00", str(loudest), "B/s"]


def test_the_plot_shows_when_it_was_loud(run):
    quiet = [line("x", f"Mar  5 14:02:{second:02}") for second in range(20)]
    loud = 8 * [line("x", "Mar  5 14:02:05")]
    LOG.write_text("".join(quiet + loud))
    rows = run("twlogctl", "stats").stdout.splitlines()
    title = next(index for index, text in enumerate(rows) if text.startswith("lines a second"))
    assert rows[title] == "lines a second, at most 9.00"
    assert rows[title + 1] == " " + 5 * " " + "█" + 14 * " "
    assert rows[title + 4] == " " + 5 * "▄" + "█" + 14 * "▄"
    assert rows[title + 5].split() == ["14:02:00", "14:02:20"]


def test_without_utf_8_the_plot_is_plain(run):
    write_known_log()
    text = run("twlogctl", "stats", env={"LC_ALL": "C"}).stdout
    assert text.isascii() and "#" in text


def test_a_day_fits_into_the_width(run):
    LOG.write_text("".join(line("x", f"Mar  5 {hour:02}:00:00") for hour in range(24)))
    assert max(map(len, run("twlogctl", "stats").stdout.splitlines())) <= 80


def test_a_process_that_runs_has_its_name(run):
    LOG.write_text(line("x", pid=str(os.getpid())) + line("y", pid="4194304"))
    with open(f"/proc/{os.getpid()}/comm", encoding="ascii") as name:
        own = name.read().strip()
    text = run("twlogctl", "stats").stdout
    assert re.search(rf"^{os.getpid()} {re.escape(own)} +1 ", text, re.M)
    assert re.search(r"^4194304 +1 ", text, re.M)


def test_names_of_peers_cannot_move_the_cursor(run):
    LOG.write_text(line("x", tags="[\x1b[2J][warn]"))
    text = run("twlogctl", "stats").stdout
    assert "\x1b" not in text


def test_there_is_no_colour_in_a_pipe_and_none_against_the_will(run, spawn):
    write_known_log()
    assert "\x1b" not in run("twlogctl", "stats").stdout
    assert "\x1b" not in spawn("twlogctl", "stats", env={"NO_COLOR": "1"}).read()
    assert "\x1b[1m" in spawn("twlogctl", "stats").read()


def test_watching_counts_the_last_minute_again_and_again(start):
    old = line("old", time.strftime("%b %e %T", time.localtime(time.time() - 3600)))
    LOG.write_text(old + now_line("new"))
    output = Output(start("twlogctl", "stats", "--watch", "200ms", "--json"))
    output.wait_for('"by":"process"')
    assert json.loads(output.lines[0])["lines"] == 1
    with open(LOG, "a", encoding="utf-8") as log:
        log.write(10 * now_line("more", "[socket][warn]"))
    output.wait_for('"socket"')
    records = [json.loads(text) for text in output.lines]
    socket = next(record for record in records if record["name"] == "socket")
    assert (socket["lines"], socket["lines_per_second"]) == (10, round(10 / 60, 6))
    output.end()


def test_watching_takes_the_span_of_since(start):
    LOG.write_text(line("old", time.strftime("%b %e %T", time.localtime(time.time() - 1800))))
    output = Output(start("twlogctl", "stats", "--watch", "1", "--since", "1h", "--json"))
    output.wait_for('"by":"process"')
    total = json.loads(output.lines[0])
    assert total["lines"] == 1
    assert 3600 <= total["seconds"] < 3600 + HANG  # the hour began when the tool was started
    output.end()


def test_watching_ends_when_its_time_is_over(run):
    LOG.write_text(now_line("x"))
    result = run("twlogctl", "stats", "--watch", "100ms", "--until", "300ms", "--json")
    assert result.returncode == 0
    assert result.stdout.count('"by":"all"') >= 2


def test_watching_repaints_a_terminal_and_keeps_within_it(spawn):
    LOG.write_text("".join(now_line("x", f"[{name}][warn]") for name in "abcdefghijklmno"))
    words = ("twlogctl", "stats", "--watch", "100ms")
    child = spawn(*words, dimensions=(20, 80), env={"TERM": "linux"})
    screen = Screen(child, 20, 80)
    screen.wait_for("lines a second")
    with open(LOG, "a", encoding="utf-8") as log:
        log.write(100 * now_line("x", "[loud][warn]"))
    screen.wait_for("loud ")
    assert str(LOG) in screen.rows()[0]
    assert sum("lines a second" in row for row in screen.rows()) == 1


def test_a_log_without_a_match_is_a_result(run):
    write_known_log()
    result = run("twlogctl", "stats", "-c", "camera")
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"twlogctl: {LOG}: no message matches\n"


def test_a_missing_log_is_named(run):
    result = run("twlogctl", "stats")
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"twlogctl: {LOG}: No such file or directory\n"


@pytest.mark.parametrize("args", [[], ["--watch", "1"]])
def test_a_log_without_permission_is_named(command, args):
    write_known_log()
    LOG.chmod(0)
    result = run_plain(without_privileges(command("twlogctl", "stats", *args)))
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"twlogctl: {LOG}: Permission denied\n"


@pytest.mark.parametrize(
    "args", [[], ["--json"], ["--watch", "100ms"], ["--watch", "100ms", "--json"]]
)
def test_a_reader_that_goes_ends_it_as_the_signal_does(command, args):
    LOG.write_text("".join(now_line("x", f"[category-{n}][warn]") for n in range(3000)))
    child = subprocess.Popen(
        command("twlogctl", "stats", "-n", "100000", *args),
        stdout=subprocess.PIPE,
        env=plain_environment(),
    )
    child.stdout.read(1)
    child.stdout.close()
    assert child.wait(timeout=HANG) == -13


@pytest.mark.parametrize(
    "args, phrase",
    [
        (["-c", "htpt"], "did you mean http?"),
        (["-l", "wran"], "did you mean warn"),
        (["-p", "x"], "no whole number"),
        (["-n", "x"], "no whole number"),
        (["-g", "[", "--regex"], "--grep"),
        (["--since", "soon"], "neither a time"),
        (["--until", "soon"], "neither a time"),
        (["--watch", "1ms"], "no span of 100 ms or more"),
        (["--watch", "often"], "no span of 100 ms or more"),
        (["--file", "x", "--notification"], "excludes"),
        (["--watch", "1", "--file", "-"], "standard input cannot be followed"),
        (["http"], "http"),
    ],
)
def test_wrong_arguments_are_explained(run, args, phrase):
    write_known_log()
    result = run("twlogctl", "stats", *args)
    assert (result.returncode, result.stdout) == (2, "")
    assert phrase in result.stderr
