"""Each fault of the simulated camera, seen on the wire by a client of raw bytes."""

import json
import re
import socket
import time

import pytest

from conftest import HANG
from twcamsim_support import (
    GET,
    body_of,
    camera,
    head_of,
    headers_of,
    md5,
    read_all,
    status_of,
)

# How long a client waits before it takes a silence for one, behind all that must come.
SILENCE = 1.0
HEAD = b"HTTP/1.1 200 OK\r\n"


def ask(camera, *faults, endpoint="json", silence=HANG, request=GET):
    words = [word for fault in faults for word in ("-f", fault)]
    return camera("-e", endpoint, *words).ask(request, silence=silence)


def usual(camera):
    return camera("-e", "json").ask().bytes


# ---- the connection


def test_fault_refuse_refuses(camera):
    with pytest.raises(ConnectionRefusedError):
        camera("-e", "json", "-f", "refuse").connect()


def test_fault_black_hole_answers_no_syn(camera):
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


# ---- lengths

BODY_SIZE = len(b'{"camera":"north gate","model":"TW-1","presets":4,"success":true}')


@pytest.mark.parametrize(
    "fault, values",
    [
        ("length-too-long", [str(BODY_SIZE + 10)]),
        ("length-too-long=3", [str(BODY_SIZE + 3)]),
        ("length-too-short", [str(BODY_SIZE - 5)]),
        ("length-missing", []),
        ("length-double", [str(BODY_SIZE), str(BODY_SIZE + 10)]),
        ("length-negative", ["-1"]),
        ("length-zero", ["0"]),
        ("length-huge", ["9" * 20]),
        ("length-text", ["many"]),
        ("length-empty", [""]),
    ],
)
def test_fault_of_the_length(camera, fault, values):
    seen = ask(camera, fault)
    assert headers_of(seen.bytes, "Content-Length") == values
    assert (body_of(seen.bytes), seen.end) == (body_of(usual(camera)), "close")


# ---- chunks


def chunked(camera, fault):
    seen = ask(camera, fault)
    assert headers_of(seen.bytes, "Transfer-Encoding") == ["chunked"]
    return body_of(seen.bytes)


def join_chunks(data):
    """Decodes good chunks, extensions and trailers included; gives the sizes' texts as well."""
    body, sizes = b"", []
    while True:
        line, _, data = data.partition(b"\r\n")
        sizes.append(line.decode())
        size = int(line.partition(b";")[0], 16)
        if size == 0:
            return body, sizes, data
        assert data[size : size + 2] == b"\r\n"
        body, data = body + data[:size], data[size + 2 :]


def test_fault_chunks_are_good_ones(camera):
    body, sizes, rest = join_chunks(chunked(camera, "chunks=8"))
    assert (body, rest) == (body_of(usual(camera)), b"\r\n")
    assert sizes == ["8"] * (BODY_SIZE // 8) + [f"{BODY_SIZE % 8:x}", "0"]


def test_fault_chunk_extension_has_extensions(camera):
    body, sizes, _ = join_chunks(chunked(camera, "chunk-extension"))
    assert body == body_of(usual(camera))
    assert all(";name=" in size for size in sizes[:-1])


def test_fault_chunk_upper_case_has_upper_case(camera):
    data = ask(camera, "chunk-upper-case", "big-body=29").bytes
    body, sizes, _ = join_chunks(body_of(data))
    assert len(body) == 29 + len('{"success":true,"filler":""}')
    assert all(re.fullmatch("000[0-9A-F]+", size) for size in sizes[:-1])
    assert re.search("[A-F]|13", "".join(sizes))


def test_fault_chunk_trailer_has_a_trailer(camera):
    body, _, rest = join_chunks(chunked(camera, "chunk-trailer"))
    assert (body, rest) == (body_of(usual(camera)), b"X-Checksum: 5f3d9c\r\n\r\n")


def test_fault_chunk_and_length_has_both(camera):
    seen = ask(camera, "chunk-and-length")
    assert headers_of(seen.bytes, "Content-Length") == ["7"]
    assert join_chunks(body_of(seen.bytes))[0] == body_of(usual(camera))


@pytest.mark.parametrize(
    "fault, second",
    [
        ("chunk-bad-size", b"zz"),
        ("chunk-empty-size", b""),
        ("chunk-overflow", b"10000000000000005"),
        ("chunk-negative", b"-5"),
        ("chunk-too-long", b"fffff"),
    ],
)
def test_fault_of_the_second_chunks_size(camera, fault, second):
    data = chunked(camera, fault)
    size, _, rest = data.partition(b"\r\n")
    count = int(size, 16)
    assert rest[count : count + 2 + len(second) + 2] == b"\r\n" + second + b"\r\n"


def test_fault_chunk_no_line_end_leaves_it_out(camera):
    data = chunked(camera, "chunk-no-line-end")
    count = int(data.partition(b"\r\n")[0], 16)
    rest = data.partition(b"\r\n")[2][count:]
    assert re.match(rb"[0-9a-f]+\r\n", rest)


def test_fault_chunk_no_last_closes_instead(camera):
    data = chunked(camera, "chunk-no-last")
    whole, _, _ = join_chunks(data + b"0\r\n\r\n")
    assert whole == body_of(usual(camera))


# ---- heads


@pytest.mark.parametrize(
    "fault, beginning",
    [
        ("http-2-status", b"HTTP/2.0 200 OK\r\n"),
        ("no-status-line", b"Content-Type: application/json\r\n"),
        ("no-code", b"HTTP/1.1\r\n"),
        ("no-reason", b"HTTP/1.1 200\r\n"),
        ("status-code", b"HTTP/1.1 2OO OK\r\n"),
        ("status-code=99", b"HTTP/1.1 99 OK\r\n"),
        ("status-code=-1", b"HTTP/1.1 -1 OK\r\n"),
        ("status-code=99999999999", b"HTTP/1.1 99999999999 OK\r\n"),
        ("long-status=3000", b"HTTP/1.1 200 " + b"x" * 3000 + b"\r\n"),
        ("informational", b"HTTP/1.1 100 Continue\r\n\r\n" + HEAD),
        ("informational=3", b"HTTP/1.1 100 Continue\r\n\r\n" * 3 + HEAD),
        ("status=302", b"HTTP/1.1 302 Found\r\n"),
        ("status=404", b"HTTP/1.1 404 Not Found\r\n"),
        ("status=414", b"HTTP/1.1 414 URI Too Long\r\n"),
        ("status=500", b"HTTP/1.1 500 Internal Server Error\r\n"),
        ("status=503", b"HTTP/1.1 503 Service Unavailable\r\n"),
        ("status=299", b"HTTP/1.1 299 Unusual\r\n"),
        ("head-lines-first=2", HEAD + b"X-Filler-0: 0\r\nX-Filler-1: 1\r\n"),
    ],
)
def test_fault_of_the_status_line(camera, fault, beginning):
    assert ask(camera, fault).bytes.startswith(beginning)


def test_fault_other_protocol_speaks_another_one(camera):
    assert ask(camera, "other-protocol") == (b"220 camera service ready\r\n", "close")


@pytest.mark.parametrize("fault, end", [("bare-lf", b"\n"), ("cr-only", b"\r")])
def test_fault_of_the_line_ends(camera, fault, end):
    whole = usual(camera)
    size = whole.index(b"\r\n\r\n") + 4
    assert ask(camera, fault).bytes == whole[:size].replace(b"\r\n", end) + whole[size:]


@pytest.mark.parametrize(
    "fault, line",
    [
        ("no-colon", b"\r\nX-No-Colon 17\r\n"),
        ("empty-name", b"\r\n: nameless\r\n"),
        ("only-colon", b"\r\n:\r\n"),
        ("folded-header", b"\r\nX-Folded: one\r\n\ttwo\r\n"),
        ("zero-in-head", b"\r\nX-Zero: a\0b\r\n"),
        ("lower-case-head", b"\r\ncontent-type: application/json\r\n"),
        ("blank-before-colon", b"\r\nContent-Type : application/json\r\n"),
        ("head-lines", b"X-Filler-99: 99\r\n"),
        ("long-line=5000", b"\r\nX-Long: " + b"x" * 5000 + b"\r\n"),
    ],
)
def test_fault_of_a_header(camera, fault, line):
    seen = ask(camera, fault)
    assert line in seen.bytes and body_of(seen.bytes) == body_of(usual(camera))


def test_fault_long_line_is_10_mib_as_it_stands(camera):
    assert b"x" * 10485760 + b"\r\n" in ask(camera, "long-line").bytes


def test_fault_no_blank_line_ends_in_the_head(camera):
    whole = usual(camera)
    expected = whole[: whole.index(b"\r\n\r\n") + 2]
    assert ask(camera, "no-blank-line") == (expected, "close")


@pytest.mark.parametrize(
    "fault, where", [("redirect", "/info.json"), ("redirect=http://[::1]/", "http://[::1]/")]
)
def test_fault_redirect_leads_there(camera, fault, where):
    seen = ask(camera, fault)
    assert (status_of(seen.bytes), headers_of(seen.bytes, "Location")) == (302, [where])


# ---- bodies


@pytest.mark.parametrize(
    "fault, kind, body",
    [
        ("success-false", "application/json", b'{"success":false,"error":{"code":105}}'),
        ("success-missing", "application/json", b'{"camera":"north gate"}'),
        ("success-text", "application/json", b'{"success":"yes"}'),
        ("json-array", "application/json", b"[true]"),
        ("json-broken", "application/json", b'{"success":true,"camera":"nor'),
        ("json-bomb=3", "application/json", b'{"success":true,"deep":[[[]]]}'),
        ("big-body=3", "application/json", b'{"success":true,"filler":"xxx"}'),
        (
            "wrong-charset",
            "application/json; charset=utf-8",
            b'{"success":true,"camera":"Nordt\xf6r"}',
        ),
        ("xml-broken", "application/xml", b'<?xml version="1.0"?>\n<reply><preset>7</reply>\n'),
        ("xml-deep=2", "application/xml", b'<?xml version="1.0"?>\n<a><a></a></a>\n'),
        ("empty-body", "application/json", b""),
    ],
)
def test_fault_of_the_body(camera, fault, kind, body):
    seen = ask(camera, fault)
    assert headers_of(seen.bytes, "Content-Type") == [kind]
    assert headers_of(seen.bytes, "Content-Length") == [str(len(body))]
    assert body_of(seen.bytes) == body


def test_fault_xml_bomb_multiplies(camera):
    body = body_of(ask(camera, "xml-bomb=2").bytes).decode()
    assert '<!ENTITY e0 "boom">' in body and "<bomb>&e2;</bomb>" in body
    assert '<!ENTITY e2 "' + "&e1;" * 10 + '">' in body


def test_fault_json_bomb_is_deep_as_it_stands(camera):
    body = body_of(ask(camera, "json-bomb").bytes)
    assert body.count(b"[") == body.count(b"]") == 100000


def test_fault_html_page_is_for_people(camera):
    seen = ask(camera, "html-page")
    assert headers_of(seen.bytes, "Content-Type") == ["text/html"]
    with pytest.raises(json.JSONDecodeError):
        json.loads(body_of(seen.bytes))


def test_fault_zero_bytes_stand_in_the_middle(camera):
    body = body_of(ask(camera, "zero-bytes").bytes)
    assert body.replace(b"\0", b"") == body_of(usual(camera)) and body.count(b"\0") == 3


def test_fault_byte_order_mark_stands_in_front(camera):
    assert body_of(ask(camera, "byte-order-mark").bytes) == b"\xef\xbb\xbf" + body_of(usual(camera))


def test_fault_wrong_type_and_false_gzip_change_the_head_alone(camera):
    seen = ask(camera, "wrong-type=image/gif", "false-gzip")
    assert headers_of(seen.bytes, "Content-Type") == ["image/gif"]
    assert headers_of(seen.bytes, "Content-Encoding") == ["gzip"]
    assert body_of(seen.bytes) == body_of(usual(camera))


def test_fault_extra_bytes_follow_the_body(camera):
    data = ask(camera, "extra-bytes").bytes
    assert body_of(data).startswith(body_of(usual(camera)) + b"HTTP/1.1 200 OK\r\n")
    assert headers_of(data, "Content-Length") == [str(BODY_SIZE)]


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
    folder = __file__.rpartition("/")[0]
    sources = "".join(
        open(f"{folder}/twcamsim_{area}_test.py", encoding="utf-8").read()
        for area in ("faults", "login", "tls")
    )
    assert [name for name in listed if not re.search(rf'"{name}["=]', sources)] == []


def test_a_body_without_a_fault_is_the_same_each_time(camera):
    assert md5(usual(camera).decode()) == md5(usual(camera).decode())
    assert head_of(usual(camera)).startswith("HTTP/1.1 200 OK")
