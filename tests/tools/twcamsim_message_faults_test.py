"""The faults of the simulated camera in lengths, chunks, heads and bodies, seen as raw bytes."""

import json
import re

import pytest

from twcamsim_support import HEAD, ask, body_of, camera, headers_of, status_of, usual

pytestmark = pytest.mark.native


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
    """Decodes good chunks, extensions and trailers included; returns the sizes as written, too."""
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
