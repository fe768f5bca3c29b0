"""Each way to fail has its exit code, and the explanation names the cause."""

import contextlib
import re
import signal
import socket
import subprocess

import pytest

from conftest import HANG, ROOT, wait_until
from twhttp_fixtures import identity, peer  # noqa: F401 (fixtures)
from twhttp_server import Script, challenge, closed_port, response

LOGIN = "operator:gate-7"
DIGEST = 'Digest realm="camera", nonce="5f3d9c", qop="auth"'
CHUNKED = b"HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n"


def explained(result, code, *phrases):
    """The run ended with `code` and said why; returns what it said."""
    assert result.returncode == code, result.stderr
    for phrase in phrases:
        assert phrase in result.stderr
    assert re.search(r"^twhttp: [a-z-]+: ", result.stderr)
    return result.stderr


def test_success_is_0_and_silent(run, peer):
    result = run("twhttp", "get", peer(response(b"ready")).url("state"))
    assert (result.returncode, result.stdout, result.stderr) == (0, "ready", "")


def test_the_table_of_codes_is_that_of_the_manual_page(run):
    listed = run("twhttp", "codes")
    assert listed.returncode == 0
    manual = (ROOT / "tools/twhttp/twhttp.1").read_text()
    codes = re.findall(r"^ *(\d+) +([a-z-]+) ", listed.stdout, re.M)
    assert len(codes) > 20
    for code, name in codes:
        assert f".It {code} {name}\n" in manual


def test_a_name_without_an_address_is_10(run):
    result = run("twhttp", "get", "http://no-such-camera.invalid/")
    explained(result, 10, "phase    look-up", "getent ahostsv4 no-such-camera.invalid")


def test_libcurl_fails_at_the_look_up_with_10_as_well(run):
    result = run("twhttp", "curl-get", "http://no-such-camera.invalid/")
    explained(result, 10, "phase    look-up", "libcurl: Could not resolve host")


@pytest.mark.parametrize("operation", ["get", "curl-get", "json-get"])
def test_a_port_without_a_listener_is_11(run, operation):
    result = run("twhttp", operation, f"http://127.0.0.1:{closed_port()}/")
    explained(result, 11, "phase    connect", "nothing listens there")


def test_an_address_without_a_route_is_12(run):
    result = run("twhttp", "get", "http://192.0.2.1/")
    explained(result, 12, "Network is unreachable", "ip route get")


@pytest.mark.parametrize("operation", ["get", "curl-get"])
def test_a_host_that_answers_nothing_is_13(run, operation):
    with socket.create_server(("127.0.0.1", 0), backlog=0) as full:
        address = full.getsockname()
        waiting = [socket.socket(type=socket.SOCK_STREAM | socket.SOCK_NONBLOCK) for _ in range(4)]
        for client in waiting:
            client.connect_ex(address)
        result = run("twhttp", operation, "--timeout", 1, f"http://127.0.0.1:{address[1]}/")
        for client in waiting:
            client.close()
    explained(result, 13, "phase    connect", "limit: 1.00 s")


@pytest.mark.parametrize("operation", ["get", "curl-get"])
@pytest.mark.parametrize("start", [b"", response(b"x" * 99)[:60]], ids=["head", "body"])
def test_a_reset_is_14_wherever_it_comes(run, peer, operation, start):
    server = peer(Script(start, end="reset"))
    explained(run("twhttp", operation, server.url()), 14, "Connection reset by peer")


@pytest.mark.parametrize("operation", ["get", "curl-get", "json-get"])
def test_a_close_without_a_word_is_15(run, peer, operation):
    explained(run("twhttp", operation, peer(b"").url()), 15, "0 bytes came before that")


def test_a_peer_that_closes_during_an_upload_is_16(start, peer):
    server = peer(Script(until=b'name="file"\r\n\r\n'))
    child = start("twhttp", "upload", "-f", "-", server.url(), stdin=subprocess.PIPE)
    wait_until(lambda: server.closed, "the close of the connection")
    with contextlib.suppress(BrokenPipeError):  # the first piece causes a reset
        child.stdin.write("x" * 1000000)
        child.stdin.close()
    assert child.wait(HANG) == 16
    assert "Broken pipe" in child.stderr.read()


@pytest.mark.parametrize(
    "piece", [b"", b"HTTP/1.1 200 OK\r\nContent", response(b"x" * 99)[:60]], ids=range(3)
)
def test_silence_is_20_in_the_head_and_in_the_body(run, peer, piece):
    server = peer(Script(piece, end="hold"))
    result = run("twhttp", "get", "--direct", "--timeout", 1, server.url())
    explained(result, 20, f"{len(piece)} bytes came, then nothing for 1.0", "1.00 s a wait")


def test_silence_is_20_through_libcurl(run, peer):
    server = peer(Script(response(b"x" * 99)[:60], end="hold"))
    result = run("twhttp", "curl-get", "--timeout", 1, server.url())
    explained(result, 20, "phase    body", "limit: 1.00 s for the whole transfer")


def test_a_connection_that_is_kept_open_after_its_body_is_21(run, peer):
    server = peer(Script(response(b"whole"), end="hold"))
    result = run("twhttp", "get", "--direct", "--http", "1.1", "--timeout", 1, server.url())
    explained(result, 21, "--http 1.0", "the body was complete")
    assert result.stdout == "whole"


def test_an_operation_without_a_limit_that_waits_for_good_is_22(run, peer):
    server = peer(Script(end="hold"))
    result = run("twhttp", "xml-delete", "--give-up", "1s", server.url())
    explained(result, 22, "nothing happened for 1.00 s (--give-up)", "limit: none")


def test_a_plain_server_for_https_is_30(run, peer):
    server = peer(Script(b"HTTP/1.0 400 no\r\n\r\n", read=False))
    url = f"https://127.0.0.1:{server.port}/"
    explained(run("twhttp", "get", url), 30, "phase    TLS", "the port speaks plain HTTP")


def test_a_stalled_handshake_is_30(run, peer):
    server = peer(Script(read=False, end="hold"))
    result = run("twhttp", "get", "--give-up", "1s", f"https://127.0.0.1:{server.port}/")
    explained(result, 30, "says nothing in the handshake", "limit: none in the library")


def test_a_certificate_of_the_devices_own_making_is_31(run, peer, identity):
    server = peer(response(b"{}"), tls=identity[0])
    explained(run("twhttp", "json-gets", server.url()), 31, "of the peer's own making")
    explained(run("twhttp", "curl-get", server.url()), 31, "twhttp curl-get -v --insecure")
    assert run("twhttp", "curl-get", "--insecure", server.url()).stdout == "{}"


@pytest.mark.parametrize(
    "head, phrase",
    [
        (b"SSH-2.0-camera\r\n", 'begins with "SSH-2.0-camera"'),
        (b"HTTP/1.1 200 OK\r\nContent-Len", "the peer closed in the middle of the head"),
        (b"HTTP/1.1 200 OK\r\nX: " + b"y" * 5000 + b"\r\n\r\nbody", "cuts a line at 2,047 bytes"),
        (b"HTTP/1.1 200 OK\r\n" + b"X: y\r\n" * 40 + b"\r\nbody", "40 header lines"),
        (b"HTTP/1.1 200 OK\r\nContent-Type:\r\n\r\n", "an empty Content-Type line"),
        (b"HTTP/2.0 200 OK\r\n\r\n", 'begins with "HTTP/2.0 200 OK"'),
        (CHUNKED.replace(b"chunked", b"Chunked") + b"0\r\n\r\n", 'decodes "chunked" alone'),
    ],
    ids=range(7),
)
def test_a_head_that_the_library_reads_otherwise_is_40(run, peer, head, phrase):
    explained(run("twhttp", "get", peer(head).url()), 40, phrase)


@pytest.mark.parametrize(
    "script, phrase",
    [
        (response(b"x" * 100)[:-90], "100 bytes were announced and 10 came"),
        (CHUNKED + b"5\r\nhe", "3 bytes of a chunk did not come"),
        (CHUNKED + b"5\r\nhello\r\n", "the last chunk did not come"),
    ],
    ids=range(3),
)
def test_a_body_that_ends_early_is_41(run, peer, script, phrase):
    explained(run("twhttp", "get", peer(script).url()), 41, phrase)


def test_a_body_that_ends_early_is_41_through_libcurl(run, peer):
    server = peer(response(b"x" * 100)[:-90])
    explained(run("twhttp", "curl-get", server.url()), 41, "100 bytes were announced and 10 came")


@pytest.mark.parametrize(
    "script", [CHUNKED + b"0\r\n\r\n", b"HTTP/1.0 200 OK\r\n\r\n<a/>", response()], ids=range(3)
)
def test_a_soap_response_without_a_length_is_42(run, peer, script):
    explained(run("twhttp", "soap", "-d", "<a/>", peer(script).url()), 42, "Content-Length")


@pytest.mark.parametrize("operation", ["get", "xml-get", "soap-auth"])
@pytest.mark.parametrize("asked", [DIGEST, 'Basic realm="camera"'])
def test_credentials_that_are_refused_are_50(run, peer, operation, asked):
    body = ["-d", "<a/>"] if operation == "soap-auth" else []
    server = peer(Script(challenge(asked)))
    result = run("twhttp", operation, *body, server.url("", LOGIN))
    explained(result, 50, "user or password is wrong")
    assert "gate-7" not in result.stderr


def test_a_stale_nonce_and_a_foreign_algorithm_are_named(run, peer):
    stale = peer(challenge(DIGEST + ", stale=true"))
    explained(run("twhttp", "get", stale.url("", LOGIN)), 50, "1. the peer calls the nonce stale")
    foreign = peer(challenge(DIGEST + ", algorithm=SHA-256"))
    explained(run("twhttp", "get", foreign.url("", LOGIN)), 50, "1. the peer asks for SHA-256")


def test_credentials_that_are_wanted_and_not_given_are_51(run, peer):
    server = peer(challenge('Bearer realm="camera"'))
    explained(run("twhttp", "get", server.url("", LOGIN)), 51, "1. the peer offers Bearer")
    server = peer(challenge(DIGEST))
    result = run("twhttp", "soap", "-d", "<a/>", server.url())
    explained(result, 51, "1. the operation sends no credentials")


@pytest.mark.parametrize("operation", ["get", "curl-get", "json-get", "xml-get"])
def test_a_status_that_is_no_success_is_52(run, peer, operation):
    server = peer(response(b"gone", "404 Not Found"))
    result = run("twhttp", operation, server.url())
    explained(result, 52, "HTTP/1.1 404 Not Found", "does not exist")


def test_a_redirect_names_where_to(run, peer):
    server = peer(response(b"", "302 Found", ["Location: http://elsewhere/"]))
    explained(run("twhttp", "get", server.url()), 52, "redirects to http://elsewhere/")


@pytest.mark.parametrize("words", [["xml-get"], ["soap-xml", "-d", "<a/>"]])
def test_a_response_that_is_no_xml_is_60(run, peer, words):
    server = peer(response(b"<html><p>no</html>"))
    explained(run("twhttp", *words, server.url()), 60, "phase    content", "mismatch")


def test_a_response_that_is_no_json_is_61(run, peer):
    explained(run("twhttp", "json-get", peer(response(b"<html>")).url()), 61, "phase    content")


@pytest.mark.parametrize("body", [b'{"success":false,"why":5}', b'{"other":1}'])
def test_json_without_success_is_62_and_is_shown(run, peer, body):
    result = run("twhttp", "json-get", peer(response(body)).url())
    explained(result, 62)
    assert result.stdout == body.decode() + "\n"


def test_an_empty_json_response_is_63(run, peer):
    explained(run("twhttp", "json-get", peer(response()).url()), 63)


def test_what_has_no_class_is_1(run, peer):
    explained(run("twhttp", "raw-resp", peer(response(b'{"error":true}')).url()), 1)


def test_files_that_cannot_be_used_are_3(run, peer, tmp_path):
    url = peer(response(b"x")).url()
    assert run("twhttp", "form", "-f", tmp_path / "none", url).returncode == 3
    assert run("twhttp", "curl-get", "--response-file", tmp_path / "a/b", url).returncode == 3
    (tmp_path / "file").write_text("")
    assert run("twhttp", "get", "--record", tmp_path / "file", url).returncode == 3


def test_standard_output_that_is_full_is_3(start, peer):
    with open("/dev/full", "w") as full:
        child = start("twhttp", "get", peer(response(b"x")).url(), stdout=full)
        assert child.wait(HANG) == 3
    assert "local-file" in child.stderr.read()


@pytest.mark.parametrize("words", [["get"], ["xml-delete"], ["get", "--timeout", "-1"]])
def test_control_c_ends_with_130(start, peer, words):
    server = peer(Script(end="hold"))
    child = start("twhttp", *words, server.url())
    assert server.arrived.wait(HANG)
    child.send_signal(signal.SIGINT)
    assert child.wait(HANG) == 130
    assert "twhttp: interrupted: " in child.stderr.read()


def test_a_reader_who_goes_ends_it_by_sigpipe(start, peer):
    server = peer(Script(b"HTTP/1.0 200 OK\r\n\r\n", *[b"x" * 65536] * 400))
    child = start("twhttp", "get", server.url())
    assert child.stdout.read(10) == "x" * 10
    child.stdout.close()
    assert child.wait(HANG) == -signal.SIGPIPE
