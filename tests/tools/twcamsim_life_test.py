"""The simulated camera as a process: its end, its limits, its seed."""

import json
import os
import resource
import signal
import ssl
import subprocess

import pytest

from conftest import HANG, wait_until
from twcamsim_support import GET, camera, challenge_words, headers_of, read_all, status_of

pytestmark = pytest.mark.native


# ---- the end


@pytest.mark.parametrize("number", [signal.SIGTERM, signal.SIGINT])
def test_a_signal_ends_it_cleanly_in_the_middle_of_everything(camera, number):
    running = camera("-e", "multipart", "-e", "json,tls", "-e", "json,fault=stall-after-head")
    directory = os.path.dirname(running.report["ca"])
    clients = [running.connect(name) for name in running.endpoints]
    clients[0].sendall(b"GET /live.mjpg HTTP/1.0\r\n\r\n")
    clients[2].sendall(GET)
    assert clients[0].recv(9) == b"HTTP/1.1 "
    assert clients[2].recv(9) == b"HTTP/1.1 "
    running.child.send_signal(number)
    assert running.child.wait(timeout=HANG) == 0
    assert running.child.stderr.read() == ""
    assert not os.path.exists(directory)
    assert {entry["end"] for entry in running.journal(3)} <= {"stopped", "tls-broken"}
    for client in clients:
        client.close()


def test_it_can_end_by_itself(run):
    done = run("twcamsim", "-e", "json", "--for", "100ms")
    assert done.returncode == 0 and json.loads(done.stdout)["endpoints"]


def test_a_directory_that_was_asked_for_stays(camera, tmp_path):
    running = camera("-e", "json,tls", "--dir", tmp_path / "new" / "folder")
    authority = tmp_path / "new" / "folder" / "ca.pem"
    assert running.report["ca"] == str(authority)
    assert running.end() == 0
    assert ssl.create_default_context(cafile=authority).cert_store_stats()["x509_ca"] == 1


def test_a_standard_output_that_is_gone_ends_it_before_it_serves(command):
    reading, writing = os.pipe()
    os.close(reading)
    child = subprocess.Popen(command("twcamsim", "-e", "json"), stdout=writing)
    os.close(writing)
    assert child.wait(timeout=HANG) in (-signal.SIGPIPE, 1)


def test_an_idle_connection_is_closed(camera):
    running = camera("-e", "json", "--idle", "300ms")
    with running.connect() as client:
        assert read_all(client, HANG) == (b"", "close")
    assert running.journal()[0]["end"] == "timeout"


def test_a_stall_ends_after_the_longest_hold(camera):
    running = camera("-e", "json", "--hold", "300ms", "-f", "stall-before-status")
    assert running.ask() == (b"", "close")
    assert running.journal()[0]["end"] == "timeout"


def test_many_clients_are_served_at_once(camera):
    running = camera("-e", "json")
    clients = [running.connect() for _ in range(300)]  # more than it serves at a time
    for client in reversed(clients[:200]):
        client.sendall(GET)
        assert status_of(read_all(client, HANG).bytes) == 200
        client.close()
    for client in clients[200:]:
        client.sendall(GET)
        assert status_of(read_all(client, HANG).bytes) == 200
        client.close()


def test_it_serves_again_when_there_are_descriptors_again(camera):
    running = camera("-e", "json")
    resource.prlimit(running.report["pid"], resource.RLIMIT_NOFILE, (24, 24))
    clients = [running.connect() for _ in range(40)]
    for client in clients:
        client.close()
    # Until the last of them has ended, a connection may be closed at once.
    wait_until(lambda: running.ask().bytes.startswith(b"HTTP/1.1 200"), "a response")
    assert running.end() == 0


# ---- the seed


def nonces(running):
    found = []
    for _ in range(3):
        challenge = headers_of(running.ask().bytes, "WWW-Authenticate")[0]
        found.append(challenge_words(challenge)["nonce"])
    return found


def test_the_same_seed_gives_the_same_nonces(camera):
    first, same, other = (
        nonces(camera("-e", "cgi-digest", "--seed", seed)) for seed in ("7", "7", "8")
    )
    assert first == same and len(set(first + other)) == 6


def test_without_a_seed_each_run_differs_and_tells_its_seed(camera):
    free = camera("-e", "cgi-digest")
    again = camera("-e", "cgi-digest", "--seed", free.report["seed"])
    assert nonces(free) == nonces(again)
    assert camera("-e", "json").report["seed"] != free.report["seed"]
