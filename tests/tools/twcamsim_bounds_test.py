"""twcamsim among strangers: what it holds in memory is bounded, its files are its own, and it says
when it listens on a network; recordings that were made to hurt are refused."""

import json
import os
import random
import socket

import pytest

from conftest import HANG, wait_until
from twcamsim_journal_test import write_recording
from twcamsim_support import GET, camera, read_all, status_of

MIB = 1 << 20


# Memory


def post(announced):
    return f"POST /json.cgi HTTP/1.1\r\nHost: c\r\nContent-Length: {announced}\r\n\r\n".encode()


def send_most(client, size):
    """Sends so many bytes, or as many as the peer takes."""
    try:
        client.sendall(b"x" * size)
    except OSError:
        pass


def test_all_bodies_together_are_bounded_and_what_ended_makes_room(camera):
    running = camera("-e", "json")
    holders = [running.connect() for _ in range(3)]
    for client in holders:
        client.sendall(post(40 * MIB))
        send_most(client, 39 * MIB)
    refused = []
    for client in holders:
        client.settimeout(1)
        try:
            refused.append(client.recv(4096))
        except (TimeoutError, ConnectionResetError):
            pass
    assert [status_of(data) for data in refused if data] == [503]
    assert status_of(running.ask().bytes) == 200
    for client in holders:
        client.close()
    running.journal(4)
    with running.connect() as client:
        client.sendall(post(60 * MIB))
        send_most(client, 60 * MIB)
        client.settimeout(HANG)
        assert status_of(client.recv(4096)) != 503


def test_the_journal_of_one_connection_is_bounded_and_counts_the_rest(camera):
    running = camera("-e", "json")
    request = post(65536) + b"y" * 65536
    with running.connect() as client:
        for _ in range(80):
            client.sendall(request)
            response = b""
            while b"\r\n\r\n" not in response:
                response += client.recv(1 << 20)
            length = int(response.lower().split(b"content-length: ")[1].split(b"\r\n")[0])
            body = response.partition(b"\r\n\r\n")[2]
            while len(body) < length:
                body += client.recv(1 << 20)
    entry = running.journal()[0]
    assert len(entry["requests"]) + entry["more_requests"] == 80
    assert 3 * MIB < running.journal_path.stat().st_size < 6 * MIB


def test_sessions_that_have_ended_go_at_once(camera):
    running = camera("-e", "json")
    count = lambda: len(os.listdir(f"/proc/{running.child.pid}/fd"))
    before = count()
    clients = [running.connect() for _ in range(30)]
    for client in clients:
        client.sendall(GET)
        read_all(client, HANG)
        client.close()
    # No other connection comes meanwhile.
    wait_until(lambda: count() <= before, "the descriptors of the sessions")


@pytest.mark.parametrize("text, count, status", [("a\r\n", 340000, 400), ("a : b\r\n", 140000, 200)])
def test_a_head_of_many_lines_is_answered(camera, text, count, status):
    running = camera("-e", "json")
    seen = running.ask(b"GET /info.json HTTP/1.0\r\n" + text.encode() * count + b"\r\n")
    assert status_of(seen.bytes) == status


def test_a_head_may_come_byte_by_byte(camera):
    running = camera("-e", "json")
    with running.connect() as client:
        client.setsockopt(socket.IPPROTO_TCP, socket.TCP_NODELAY, 1)
        for at in range(len(GET)):
            client.sendall(GET[at : at + 1])
        assert status_of(read_all(client, HANG).bytes) == 200


def test_a_blank_in_front_of_a_colon_is_taken_out_and_the_rest_stays(camera):
    running = camera("-e", "json")
    head = b"GET /info.json?a:b HTTP/1.1\r\nHost\t : c:1\r\nX-A: b : c\r\n\r\n"
    with running.connect() as client:
        client.sendall(head)
        client.shutdown(socket.SHUT_WR)
        assert status_of(read_all(client, HANG).bytes) == 200
    assert running.journal()[0]["requests"][0]["sloppy"] == "blank in front of a colon"


# Where it listens


def test_listening_beyond_the_loopback_is_warned_of_loudly(camera):
    loopback = camera("-e", "json")
    loopback.end()
    assert loopback.child.stderr.read() == ""
    running = camera("-e", "json,name=gate", "--listen", "0.0.0.0")
    assert running.child.stderr.readline().startswith("twcamsim: WARNING: gate listens at 0.0.0.0, ")


# Files


@pytest.mark.parametrize("option", ["--journal", "--access"])
def test_its_files_are_the_callers_alone_and_no_link_is_followed(run, tmp_path, option):
    old = os.umask(0)
    try:
        done = run("twcamsim", "-e", "json", "--for", "10ms", option, tmp_path / "file")
    finally:
        os.umask(old)
    assert done.returncode == 0
    assert (tmp_path / "file").stat().st_mode & 0o7777 == 0o600
    (tmp_path / "link").symlink_to("file")
    done = run("twcamsim", "-e", "json", "--for", "10ms", option, tmp_path / "link")
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr == f"twcamsim: {tmp_path}/link: it is a link\n"


def test_a_file_of_another_user_is_no_journal(run, tmp_path):
    path = tmp_path / "file"
    os.mkfifo(path)
    try:
        os.chown(path, 65534, 65534)
    except OSError:
        pytest.skip("there is no other user here")
    done = run("twcamsim", "-e", "json", "--for", "10ms", "--journal", path)
    assert done.stderr == f"twcamsim: {path}: it belongs to another user\n"


def test_a_journal_may_be_a_descriptor_of_the_shell(run):
    done = run("twcamsim", "-e", "json", "--for", "10ms", "--journal", "/dev/stderr")
    assert done.returncode == 0


# Recordings of strangers


@pytest.fixture
def recording(tmp_path):
    directory = tmp_path / "recording"
    write_recording(directory, ([(0, b"HTTP/1.0 200 OK\r\n\r\n"), (1, b"one")], "close"))
    return directory


def refused(run, directory):
    done = run("twcamsim", "--for", "10ms", "--replay", directory)
    assert (done.returncode, done.stdout) == (2, ""), done.stderr
    assert done.stderr.count("\n") == 1
    return done.stderr


@pytest.mark.parametrize("kind", ["link", "fifo", "directory"])
@pytest.mark.parametrize("name", ["001.request", "001.response", "exchanges.jsonl"])
def test_a_recording_of_other_things_than_files_is_refused(run, recording, kind, name):
    (recording / name).rename(recording / "away")
    if kind == "link":
        (recording / name).symlink_to("away")
    elif kind == "fifo":
        os.mkfifo(recording / name)
    else:
        (recording / name).mkdir()
    told = "it is a link" if kind == "link" else "it is no regular file"
    assert f"{name}: {told}\n" in refused(run, recording)


def test_a_file_without_end_is_refused(run, recording):
    with open(recording / "001.response", "r+b") as response:
        response.truncate(257 * MIB)
    assert "001.response: File too large" in refused(run, recording)


@pytest.mark.parametrize(
    "change, told",
    [
        ({"pieces": [{"bytes": 2**64 - 1}, {"bytes": 23}]}, "not as long as the response"),
        ({"pieces": [{"bytes": 22, "delay_ms": 2**63 - 1}]}, "a delay is not between none and a day"),
        ({"pieces": [{"bytes": 22, "delay_ms": -1}]}, "a delay is not between none and a day"),
        ({"end_delay_ms": 2**62}, '"end_delay_ms" is not between none and a day'),
        ({"response": "001.response\0"}, "is no name of a file in the directory"),
        ({"number": 1e300}, "exchanges.jsonl:1: "),
        ({"pieces": [7]}, "exchanges.jsonl:1: "),
        ({"end": "\x1b[2J"}, "none of the known ends"),
    ],
)
def test_what_does_not_add_up_is_refused(run, recording, change, told):
    index = recording / "exchanges.jsonl"
    index.write_text(json.dumps({**json.loads(index.read_text()), **change}) + "\n")
    assert told in refused(run, recording)


def test_nesting_without_end_is_refused(run, recording):
    (recording / "exchanges.jsonl").write_text('{"pieces":' + "[" * 200000)
    assert "exchanges.jsonl:1: " in refused(run, recording)


def test_no_mutation_of_a_recording_ends_it_otherwise_than_by_a_message(run, recording):
    chance = random.Random(20260305)
    index = recording / "exchanges.jsonl"
    text = index.read_bytes()
    for _ in range(60):
        mutated = bytearray(text)
        for _ in range(chance.randint(1, 4)):
            at = chance.randrange(len(mutated))
            kind = chance.randrange(3)
            if kind == 0:
                mutated[at] = chance.randrange(256)
            elif kind == 1:
                del mutated[at : at + chance.randint(1, 9)]
            else:
                mutated[at:at] = mutated[: chance.randint(1, 40)]
        index.write_bytes(mutated)
        done = run("twcamsim", "--for", "1ms", "--replay", recording)
        assert done.returncode in (0, 2), (mutated, done.stderr)
        assert (done.returncode == 0) == (done.stderr == ""), (mutated, done.stderr)
        assert "\x1b" not in done.stderr
