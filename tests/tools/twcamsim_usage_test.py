"""The arguments of the simulated camera, what it prints at its start, and its lists."""

import json
import pathlib
import re
import socket

import pytest

from conftest import HANG
from twcamsim_support import GET, camera, read_all, status_of

pytestmark = pytest.mark.native


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


def test_the_page_lists_every_option_fault_profile_and_style(run):
    page = (pathlib.Path(__file__).parents[2] / "tools/twcamsim/twcamsim.1").read_text()
    options = set(re.findall(r"--([a-z-]+)", run("twcamsim", "--help").stdout)) - {"help"}
    assert [name for name in sorted(options) if f"Fl -{name}" not in page] == []
    names = set(re.findall(r"^\.It Cm (\S+)", page, re.MULTILINE))
    for table in ("--list-faults", "--list-profiles", "--list-logins"):
        assert names_of(run, table) - names == set()
