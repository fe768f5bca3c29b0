"""What the simulated camera writes down of its connections, and recordings that it plays back."""

import json
import re
import signal
import socket

import pytest

from conftest import HANG
from twcamsim_support import GET, GET_11, body_of, camera, read_all, request_with


# ---- the journal


def test_the_journal_has_a_line_for_a_connection(camera):
    running = camera("-e", "json", "-f", "lower-case-head")
    request = b"POST /echo.json?a HTTP/1.0\r\nContent-Length: 5\r\n\r\npan=3"
    seen = running.ask(request)
    entry = running.journal()[0]
    assert re.fullmatch(r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{3}Z", entry.pop("time"))
    assert re.fullmatch(r"127\.0\.0\.1:\d+", entry.pop("peer"))
    assert entry.pop("duration_ms") >= 0
    assert entry == {
        "endpoint": "json",
        "connection": 1,
        "tls": "",
        "faults": ["lower-case-head"],
        "bytes_in": len(request),
        "bytes_out": len(seen.bytes),
        "end": "closed",
        "requests": [
            {
                "method": "POST",
                "target": "/echo.json?a",
                "head": "POST /echo.json?a HTTP/1.0\r\nContent-Length: 5\r\n\r\n",
                "body": "pan=3",
                "body_bytes": 5,
                "login": {"passed": True, "scheme": "none"},
                "status": "200",
            }
        ],
    }


def test_the_journal_can_go_to_standard_output(start):
    child = start("twcamsim", "-e", "json", "--journal", "-")
    port = json.loads(child.stdout.readline())["endpoints"][0]["port"]
    with socket.create_connection(("127.0.0.1", port), HANG) as client:
        client.sendall(GET)
        read_all(client, HANG)
    assert json.loads(child.stdout.readline())["end"] == "closed"


def test_a_broken_journal_pipe_ends_it(start):
    child = start("twcamsim", "-e", "json", "--journal", "-")
    port = json.loads(child.stdout.readline())["endpoints"][0]["port"]
    child.stdout.close()
    with socket.create_connection(("127.0.0.1", port), HANG) as client:
        client.sendall(GET)
        read_all(client, HANG)
    assert child.wait(timeout=HANG) == -signal.SIGPIPE


@pytest.mark.parametrize(
    "bytes_sent, end",
    [(b"", "peer-closed"), (b"GET / HT", "peer-closed"), (GET_11, "closed")],
)
def test_the_journal_says_how_it_ended(camera, bytes_sent, end):
    running = camera("-e", "json")
    with running.connect() as client:
        client.sendall(bytes_sent)
        client.shutdown(socket.SHUT_WR)
        read_all(client, HANG)
    entry = running.journal()[0]
    assert (entry["end"], entry["bytes_in"]) == (end, len(bytes_sent))


def test_bytes_that_are_no_text_leave_the_journal_json(camera):
    running = camera("-e", "json")
    running.ask(b"GET /\xff\xfe\x01 HTTP/1.0\r\n\r\n")
    assert running.journal()[0]["requests"][0]["status"] in ("400", "404")


def test_what_is_no_request_stands_in_the_access_log_with_dashes(camera, tmp_path):
    camera("-e", "json", "--access", tmp_path / "access").ask(b"HELLO\r\n\r\n")
    assert (tmp_path / "access").read_text() == "- - 400\n"


def test_the_access_log_has_a_line_for_a_response(camera, tmp_path):
    running = camera("-e", "site", "--access", tmp_path / "access")
    for target in ("/info.json?x", "/digest/info.json", "/nothing.json"):
        running.ask(request_with("X-None: 1", target))
    running.journal(3)
    assert (tmp_path / "access").read_text() == (
        "GET /info.json 200\nGET /digest/info.json 401\nGET /nothing.json 404\n"
    )


# ---- recordings


def write_recording(directory, *exchanges):
    """Each exchange: its pieces as (delay in ms, bytes), and its end."""
    directory.mkdir()
    with open(directory / "exchanges.jsonl", "w", encoding="utf-8") as index:
        for number, (pieces, end) in enumerate(exchanges, 1):
            (directory / f"{number:03}.request").write_bytes(GET)
            (directory / f"{number:03}.response").write_bytes(b"".join(data for _, data in pieces))
            entry = {"number": number, "connection": number, "tls": False, "host": "192.0.2.7"}
            entry.update(port=80, method="GET", target="/info.json", end=end, end_delay_ms=0)
            entry.update(request=f"{number:03}.request", response=f"{number:03}.response")
            entry["pieces"] = [{"delay_ms": ms, "bytes": len(data)} for ms, data in pieces]
            index.write(json.dumps(entry) + "\n")


def test_a_recording_comes_back_in_its_order_and_begins_again(camera, tmp_path):
    write_recording(
        tmp_path / "recording",
        ([(0, b"HTTP/1.0 401 No\r\n"), (1, b"\r\n")], "close"),
        ([(0, b"HTTP/1.0 200 OK\r\n\r\nhel"), (1, b"lo")], "reset"),
    )
    running = camera("--replay", tmp_path / "recording")
    assert running.ask() == (b"HTTP/1.0 401 No\r\n\r\n", "close")
    assert running.ask(GET_11) == (b"HTTP/1.0 200 OK\r\n\r\nhello", "reset")
    assert running.ask().bytes.startswith(b"HTTP/1.0 401 ")
    assert running.journal(3)[0]["requests"][0]["status"] == "401"


def test_a_recording_keeps_its_delays(camera, tmp_path):
    write_recording(tmp_path / "recording", ([(400, b"one"), (300, b"two")], "close"))
    running = camera("--replay", tmp_path / "recording")
    seen = running.ask()
    assert seen == (b"onetwo", "close")
    assert running.journal()[0]["duration_ms"] >= 700


def test_a_kept_connection_takes_the_next_request(camera, tmp_path):
    response = b"HTTP/1.1 200 OK\r\nContent-Length: 1\r\n\r\n"
    write_recording(
        tmp_path / "recording", ([(0, response + b"a")], "kept"), ([(0, response + b"b")], "silent")
    )
    running = camera("--replay", tmp_path / "recording")
    with running.connect() as client:
        for letter in (b"a", b"b"):
            client.sendall(GET_11)
            data = b""
            while len(data) < len(response) + 1:
                data += client.recv(1000)
            assert data == response + letter
        assert read_all(client, 1) == (b"", "silent")


def test_a_recording_of_refusals_refuses(camera, tmp_path):
    write_recording(tmp_path / "recording", ([], "refused"), ([], "refused"))
    with pytest.raises(ConnectionRefusedError):
        camera("--replay", tmp_path / "recording").connect()


def test_a_broken_recording_is_refused(run, tmp_path):
    directory = tmp_path / "recording"
    write_recording(directory, ([(0, b"one")], "close"))
    (directory / "001.response").write_bytes(b"")
    done = run("twcamsim", "--replay", directory)
    assert done.returncode == 2 and "exchanges.jsonl:1" in done.stderr


def test_a_recording_with_tls_is_played_with_tls(camera, tmp_path):
    directory = tmp_path / "recording"
    write_recording(directory, ([(0, b"HTTP/1.0 200 OK\r\n\r\nin secret")], "close"))
    index = directory / "exchanges.jsonl"
    index.write_text(index.read_text().replace('"tls": false', '"tls": true'))
    running = camera("--replay", directory)
    assert running.endpoint()["tls"] and body_of(running.ask_tls().bytes) == b"in secret"
