"""The simulated camera as a program: its arguments, its start, its journal and its end."""

import json
import os
import pathlib
import re
import resource
import signal
import socket
import ssl
import subprocess

import pytest

from conftest import HANG, wait_until
from twcamsim_support import (
    GET,
    GET_11,
    body_of,
    camera,
    challenge_words,
    headers_of,
    read_all,
    request_with,
    status_of,
)


# ---- the start


def test_the_standard_endpoints_cover_every_profile_but_replay(camera, run):
    listed = run("twcamsim", "--list-profiles", "--json").stdout.splitlines()
    profiles = {json.loads(line)["name"] for line in listed}
    running = camera()
    assert {entry["profile"] for entry in running.endpoints.values()} == profiles - {"replay"}
    assert len({entry["port"] for entry in running.endpoints.values()}) == len(running.endpoints)
    assert all(socket.create_connection(("127.0.0.1", entry["port"]), HANG).close() is None
               for entry in running.endpoints.values())


def test_the_report_says_where_and_how(camera):
    running = camera("-e", "json,tls", "-f", "no-colon", "--seed", "17")
    assert running.report["seed"] == 17
    assert running.report["pid"] > 0
    entry = running.endpoint()
    assert entry["url"] == f"https://127.0.0.1:{entry['port']}/"
    assert {key: entry[key] for key in ("name", "tls", "login", "user", "password", "realm")} == {
        "name": "json-tls",
        "tls": True,
        "login": "none",
        "user": "operator",
        "password": "gate-7",
        "realm": "camera",
    }
    assert entry["faults"] == ["no-colon"]


def test_endpoints_of_one_profile_get_names_of_their_own(camera):
    running = camera("-e", "json", "-e", "json", "-e", "json,name=north")
    assert [*running.endpoints] == ["json", "json-2", "north"]


def test_it_listens_on_the_loopback_alone_unless_told(camera):
    assert camera("-e", "json").endpoint()["host"] == "127.0.0.1"
    running = camera("-e", "json", "--listen", "127.0.0.9")
    with socket.create_connection(("127.0.0.9", running.port()), HANG) as client:
        client.sendall(GET)
        assert status_of(read_all(client, HANG).bytes) == 200
    with pytest.raises(ConnectionRefusedError):
        running.connect()


def test_an_endpoint_can_have_an_address_and_a_port(camera):
    free = socket.socket()
    free.bind(("127.0.0.8", 0))
    port = free.getsockname()[1]
    free.close()
    running = camera("-e", f"json,host=127.0.0.8,port={port}")
    assert (running.endpoint()["host"], running.port()) == ("127.0.0.8", port)


def test_a_port_in_use_is_named(camera, run):
    port = camera("-e", "json").port()
    done = run("twcamsim", "-e", f"cgi,port={port}")
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr == f"twcamsim: cgi at 127.0.0.1:{port}: Address already in use\n"


@pytest.mark.parametrize(
    "words, phrase",
    [
        (["-e", "jason"], 'there is no profile "jason"; did you mean json?'),
        (["-e", ""], "profile"),
        (["-e", "json,colour=red"], 'profile json has no option "colour"'),
        (["-e", "json,prot=1"], "did you mean port?"),
        (["-e", "json,port=70000"], 'port is "70000", not a number from 0 to 65535'),
        (["-e", "json,login=digset"], "did you mean digest"),
        (["-e", "json,fault=nothing-like-it"], "there is no fault"),
        (["-e", "json,fault=slow:x"], 'fault slow: BYTES is "x", not a number from 1 to'),
        (["-e", "json,tls=no"], "tls takes no value"),
        (["-e", "snapshot,width=1"], "width"),
        (["-e", "multipart,rate=0"], "rate"),
        (["-e", "upload,after=-1"], "after"),
        (["-e", "replay"], "dir=DIR is missing"),
        (["-e", "site,posted=/nowhere/file"], "/nowhere/file cannot be written"),
        (["-f", "stal"], "did you mean stale"),
        (["-f", "no-colon=1"], "fault no-colon takes 0 argument(s), not 1"),
        (["-f", "reset-at=-1"], "fault reset-at: BYTES"),
        (["-f", "slow=1,2,3"], "takes 2 argument(s), not 3"),
        (["-f", "redirect="], "WHERE is empty"),
        (["-e", "json", "-f", "tls-stall"], "fault tls-stall needs an endpoint with TLS"),
        (["--replay", "/nowhere"], "/nowhere/exchanges.jsonl"),
        (["--seed", "x"], "--seed"),
        (["--seed", "-1"], "--seed"),
        (["--idle", "soon"], "no span"),
        (["--hold", "0"], "no span"),
        (["--for", "-1s"], "no span"),
        (["--completion", "csh"], "--completion"),
        (["--nothing-like-it"], "--nothing-like-it"),
        (["extra"], "extra"),
        (["--listen"], "--listen"),
        (["--dir"], "--dir"),
        (["--journal"], "--journal"),
        (["--access"], "--access"),
    ],
)
def test_a_wrong_argument_is_named_with_exit_2(run, words, phrase):
    done = run("twcamsim", *words)
    assert (done.returncode, done.stdout) == (2, "")
    assert done.stderr.startswith("twcamsim: ") and phrase in done.stderr


@pytest.mark.parametrize(
    "words, phrase",
    [
        (["--listen", "nowhere"], "nowhere"),
        (["--listen", "192.0.2.1"], "Cannot assign requested address"),
        (["--journal", "/nowhere/journal"], "/nowhere/journal: No such file or directory"),
        (["--access", "/nowhere/access"], "/nowhere/access: No such file or directory"),
        (["-e", "json,tls", "--dir", "/proc/nowhere"], "/proc/nowhere"),
    ],
)
def test_what_cannot_be_done_is_said_with_exit_1(run, words, phrase):
    done = run("twcamsim", *words)
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr.startswith("twcamsim: ") and phrase in done.stderr


# ---- the lists


@pytest.mark.parametrize("table", ["--list-faults", "--list-profiles", "--list-logins"])
def test_a_list_comes_as_text_and_as_json(run, table):
    text = run("twcamsim", table)
    lines = run("twcamsim", table, "--json")
    assert (text.returncode, lines.returncode) == (0, 0)
    entries = [json.loads(line) for line in lines.stdout.splitlines()]
    for entry in entries:
        assert entry["name"] in text.stdout and entry["meaning"] in text.stdout


def test_each_fault_tells_its_arguments_and_their_standards(run):
    lines = run("twcamsim", "--list-faults", "--json").stdout.splitlines()
    faults = {entry["name"]: entry for entry in map(json.loads, lines)}
    assert faults["slow"]["arguments"] == "[BYTES[,MS]]"
    assert faults["slow"]["standards"] == ["1", "50"]
    assert (faults["tls-stall"]["tls"], faults["slow"]["tls"]) == (True, False)
    assert {entry["group"] for entry in faults.values()} == {
        "connection", "tls", "timing", "length", "chunks", "head", "login", "body"
    }


@pytest.mark.parametrize(
    "typed, candidates",
    [
        (["-f", "black"], "black-hole\n"),
        (["--fault=black"], "--fault=black-hole\n"),
        (["-e", "cgi-d"], "cgi-digest\n"),
    ],
)
def test_completion_knows_faults_and_profiles(run, typed, candidates):
    assert run("twcamsim", "__complete", *typed).stdout == candidates


def test_help_has_a_sentence_for_each_option(run):
    text = re.sub(r"\s+", " ", run("twcamsim", "--help").stdout)
    own = text.partition("-e,--endpoint")[2].partition("--completion")[0]
    meanings = re.split(r"-?-[a-z-]+,?", own)
    assert own.count("--") >= 14 and all(part.count(".") for part in meanings if len(part) > 40)


def names_of(run, table):
    lines = run("twcamsim", table, "--json").stdout.splitlines()
    return {json.loads(line)["name"] for line in lines}


def test_the_page_lists_every_option_fault_profile_and_login(run):
    page = (pathlib.Path(__file__).parents[2] / "tools/twcamsim/twcamsim.1").read_text()
    options = set(re.findall(r"--([a-z-]+)", run("twcamsim", "--help").stdout)) - {"help"}
    assert [name for name in sorted(options) if f"Fl -{name}" not in page] == []
    names = set(re.findall(r"^\.It Cm (\S+)", page, re.MULTILINE))
    for table in ("--list-faults", "--list-profiles", "--list-logins"):
        assert names_of(run, table) - names == set()


# ---- the end


@pytest.mark.parametrize("number", [signal.SIGTERM, signal.SIGINT])
def test_a_signal_ends_it_cleanly_in_the_middle_of_everything(camera, number):
    running = camera("-e", "multipart", "-e", "json,tls", "-e", "json,fault=stall-after-head")
    folder = os.path.dirname(running.report["ca"])
    clients = [running.connect(name) for name in running.endpoints]
    clients[0].sendall(b"GET /live.mjpg HTTP/1.0\r\n\r\n")
    clients[2].sendall(GET)
    assert clients[0].recv(9) == b"HTTP/1.1 "
    assert clients[2].recv(9) == b"HTTP/1.1 "
    running.child.send_signal(number)
    assert running.child.wait(timeout=HANG) == 0
    assert running.child.stderr.read() == ""
    assert not os.path.exists(folder)
    assert {entry["end"] for entry in running.journal(3)} <= {"stopped", "tls-broken"}
    for client in clients:
        client.close()


def test_it_can_end_by_itself(run):
    done = run("twcamsim", "-e", "json", "--for", "100ms")
    assert done.returncode == 0 and json.loads(done.stdout)["endpoints"]


def test_a_folder_that_was_asked_for_stays(camera, tmp_path):
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


def test_a_stall_ends_behind_the_longest_hold(camera):
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
    wait_until(lambda: running.ask().bytes.startswith(b"HTTP/1.1 200"), "an answer")
    assert running.end() == 0


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


def test_the_access_log_has_a_line_for_an_answer(camera, tmp_path):
    running = camera("-e", "site", "--access", tmp_path / "access")
    for target in ("/info.json?x", "/digest/info.json", "/nothing.json"):
        running.ask(request_with("X-None: 1", target))
    running.journal(3)
    assert (tmp_path / "access").read_text() == (
        "GET /info.json 200\nGET /digest/info.json 401\nGET /nothing.json 404\n"
    )


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


# ---- recordings


def write_recording(folder, *exchanges):
    """Each exchange: its pieces as (delay in ms, bytes), and its end."""
    folder.mkdir()
    with open(folder / "exchanges.jsonl", "w", encoding="utf-8") as index:
        for number, (pieces, end) in enumerate(exchanges, 1):
            (folder / f"{number:03}.request").write_bytes(GET)
            (folder / f"{number:03}.response").write_bytes(b"".join(data for _, data in pieces))
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
    answer = b"HTTP/1.1 200 OK\r\nContent-Length: 1\r\n\r\n"
    write_recording(
        tmp_path / "recording", ([(0, answer + b"a")], "kept"), ([(0, answer + b"b")], "silent")
    )
    running = camera("--replay", tmp_path / "recording")
    with running.connect() as client:
        for letter in (b"a", b"b"):
            client.sendall(GET_11)
            data = b""
            while len(data) < len(answer) + 1:
                data += client.recv(1000)
            assert data == answer + letter
        assert read_all(client, 1) == (b"", "silent")


def test_a_recording_of_refusals_refuses(camera, tmp_path):
    write_recording(tmp_path / "recording", ([], "refused"), ([], "refused"))
    with pytest.raises(ConnectionRefusedError):
        camera("--replay", tmp_path / "recording").connect()


def test_a_broken_recording_is_refused(run, tmp_path):
    folder = tmp_path / "recording"
    write_recording(folder, ([(0, b"one")], "close"))
    (folder / "001.response").write_bytes(b"")
    done = run("twcamsim", "--replay", folder)
    assert done.returncode == 2 and "exchanges.jsonl:1" in done.stderr


def test_a_recording_with_tls_is_played_with_tls(camera, tmp_path):
    folder = tmp_path / "recording"
    write_recording(folder, ([(0, b"HTTP/1.0 200 OK\r\n\r\nin secret")], "close"))
    index = folder / "exchanges.jsonl"
    index.write_text(index.read_text().replace('"tls": false', '"tls": true'))
    running = camera("--replay", folder)
    assert running.endpoint()["tls"] and body_of(running.ask_tls().bytes) == b"in secret"
