"""The faults of the simulated camera in connection and timing, seen by a client of raw bytes."""

import json
import re
import socket
import time

import pytest

from conftest import HANG
from twcamsim_support import (
    GET,
    HEAD,
    SILENCE,
    ask,
    body_of,
    camera,
    head_of,
    headers_of,
    md5,
    read_all,
    status_of,
    usual,
)

pytestmark = pytest.mark.native


# ---- the connection


def test_fault_refuse_refuses(camera):
    with pytest.raises(ConnectionRefusedError):
        camera("-e", "json", "-f", "refuse").connect()


def test_fault_black_hole_sends_no_syn_ack(camera):
    port = camera("-e", "json", "-f", "black-hole").port()
    for _ in range(3):
        with socket.socket() as client:
            client.settimeout(SILENCE)
            with pytest.raises(TimeoutError):
                client.connect(("127.0.0.1", port))


def test_fault_slow_accept_takes_its_time(camera):
    start = time.monotonic()
    assert status_of(ask(camera, "slow-accept=700").bytes) == 200
    assert time.monotonic() - start >= 0.7


@pytest.mark.parametrize(
    "fault, expected",
    [
        ("close-at-once", (b"", "close")),
        ("reset-at-once", (b"", "reset")),
        ("close-after-request", (b"", "close")),
        ("reset-after-request", (b"", "reset")),
        ("stall-after-request", (b"", "silent")),
        ("never-read", (b"", "silent")),
        ("close-in-request=10", (b"", "close")),
        ("cut-at=30", (HEAD + b"Content-Type:", "close")),
        ("reset-at=30", (HEAD + b"Content-Type:", "reset")),
        ("reset-at", (b"", "reset")),
        ("cut-at=0", (b"", "close")),
        ("cut-head=5", (b"HTTP/", "close")),
    ],
)
def test_fault_ends_the_connection(camera, fault, expected):
    assert ask(camera, fault, silence=SILENCE if expected[1] == "silent" else HANG) == expected


def test_fault_never_read_lets_a_large_upload_get_stuck(camera):
    running = camera("-e", "upload", "-f", "never-read")
    with running.connect() as client:
        client.settimeout(SILENCE)
        with pytest.raises(TimeoutError):
            for _ in range(1000):
                client.sendall(bytes(1 << 20))


def test_fault_never_read_ends_with_its_client(camera):
    running = camera("-e", "json", "-f", "never-read")
    with running.connect() as client:
        client.sendall(GET)
    assert running.journal()[0]["end"] == "peer-closed"


def test_fault_close_in_request_closes_in_a_body_too(camera):
    request = b"POST /echo.json HTTP/1.1\r\nHost: x\r\nContent-Length: 100\r\n\r\n" + b"x" * 50
    running = camera("-e", "json", "-f", f"close-in-request={len(request)}")
    with running.connect() as client:
        client.sendall(request)
        assert read_all(client, HANG) == (b"", "close")
    assert running.journal()[0]["bytes_in"] == len(request)


def test_fault_read_slowly_takes_bytes_by_pieces(camera):
    start = time.monotonic()
    assert status_of(ask(camera, "read-slowly=5,100").bytes) == 200
    assert time.monotonic() - start >= 0.1 * (len(GET) // 5)


def test_fault_cut_body_closes_where_asked(camera):
    seen = ask(camera, "cut-body=7")
    assert (body_of(seen.bytes), seen.end) == (b'{"camer', "close")
    assert int(headers_of(seen.bytes, "Content-Length")[0]) > 7


@pytest.mark.parametrize("fault, part", [("cut-body", body_of), ("cut-head", bytes)])
def test_a_random_cut_is_inside_and_the_same_for_the_same_seed(camera, fault, part):
    whole = usual(camera)
    sizes = []
    for seed in (1, 1, 2, 3, 4, 5):
        running = camera("-e", "json", "-f", fault, "--seed", seed)
        data = running.ask().bytes
        assert whole.startswith(data) and len(part(data)) < len(part(whole))
        sizes.append(len(data))
    assert sizes[0] == sizes[1] and len(set(sizes)) > 1


# ---- timing

STALLS = {
    "stall-before-status": lambda whole: b"",
    "stall-in-status": lambda whole: whole[:8],
    "stall-after-status": lambda whole: HEAD,
    "stall-in-head": lambda whole: whole[: whole.index(b"\r\n\r\n") + 2],
    "stall-after-head": lambda whole: whole[: whole.index(b"\r\n\r\n") + 4],
    "stall-in-body": lambda whole: whole[: whole.index(b"\r\n\r\n") + 5],
    "stall-at-end": lambda whole: whole,
}


@pytest.mark.parametrize("fault", STALLS)
def test_fault_stalls_there_for_good(camera, fault):
    expected = STALLS[fault](usual(camera))
    running = camera("-e", "json", "-f", fault)
    assert running.ask(silence=SILENCE, least=len(expected)) == (expected, "silent")


@pytest.mark.parametrize("fault", STALLS)
def test_fault_stalls_there_for_a_time(camera, fault):
    argument = "9,400" if fault == "stall-in-body" else "400"
    whole = usual(camera)
    start = time.monotonic()
    assert ask(camera, f"{fault}={argument}") == (whole, "close")
    assert time.monotonic() - start >= 0.4


def test_fault_slow_sends_single_bytes(camera):
    running = camera("-e", "json", "-f", "slow=1,2")
    whole = usual(camera)
    start = time.monotonic()
    assert running.ask().bytes == whole
    assert time.monotonic() - start >= 0.002 * (len(whole) - 1)


def test_fault_slow_sends_pieces(camera):
    assert ask(camera, "slow=50,1").bytes == usual(camera)


# ---- together


def test_faults_combine_in_their_order(camera):
    running = camera("-e", "json", "-f", "success-false", "-f", "no-colon", "-f", "bare-lf")
    data = running.ask().bytes
    assert b"\nX-No-Colon 17\n" in data and data.endswith(b'{"success":false,"error":{"code":105}}')
    assert b"\r" not in data
    assert running.journal()[0]["faults"] == ["bare-lf", "no-colon", "success-false"]


@pytest.mark.parametrize("first", ["stall-before-status=100", "stall-in-head=100", "stall-after-head=100"])
def test_a_wait_is_no_place_for_another_fault(camera, first):
    expected = STALLS["stall-in-body"](usual(camera))
    running = camera("-e", "json", "-f", first, "-f", "stall-in-body=1")
    assert running.ask(silence=SILENCE, least=len(expected)) == (expected, "silent")


@pytest.mark.parametrize("first", ["no-code", "no-status-line", "other-protocol", "informational"])
def test_faults_of_the_same_place_get_along(camera, first):
    others = ["no-reason", "http-2-status", "status-code=7", "head-lines=2", "head-lines-first=2"]
    others += ["bare-lf", "no-blank-line", "cut-head=3", "stall-in-status=1", "long-status=9"]
    running = camera("-e", "json", *(word for name in [first, *others] for word in ("-f", name)))
    assert running.ask().end == "close"
    assert running.journal()[0]["end"] == "closed"


def test_a_fault_of_one_endpoint_leaves_the_others_alone(camera):
    running = camera("-e", "json,name=bad,fault=slow:7:1,fault=status:503", "-e", "json,name=good")
    assert status_of(running.ask(name="bad").bytes) == 503
    assert status_of(running.ask(name="good").bytes) == 200
    assert running.endpoint("bad")["faults"] == ["slow:7:1", "status:503"]


def test_content_faults_leave_a_challenge_alone_and_wire_faults_do_not(camera):
    seen = ask(camera, "status=500", "no-reason", endpoint="json,login=basic")
    assert seen.bytes.startswith(b"HTTP/1.1 401\r\n")


def test_each_fault_of_the_list_has_been_seen_by_these_tests(run):
    """The names in the tests' sources: a new fault needs a test."""
    lines = run("twcamsim", "--list-faults", "--json").stdout.splitlines()
    listed = [json.loads(line)["name"] for line in lines]
    assert len(listed) == len(set(listed)) >= 40
    directory = __file__.rpartition("/")[0]
    sources = "".join(
        open(f"{directory}/twcamsim_{area}_test.py", encoding="utf-8").read()
        for area in ("faults", "message_faults", "authentication", "tls")
    )
    assert [name for name in listed if not re.search(rf'"{name}["=]', sources)] == []


def test_a_body_without_a_fault_is_the_same_each_time(camera):
    assert md5(usual(camera).decode()) == md5(usual(camera).decode())
    assert head_of(usual(camera)).startswith("HTTP/1.1 200 OK")
