"""What each profile of the simulated camera responds to clients that behave."""

import http.client
import json
import shutil
import socket
import subprocess
import urllib.error
import urllib.request
import xml.etree.ElementTree as ElementTree

import pytest

from conftest import HANG
from twcamsim_support import GET, body_of, camera, headers_of, read_all, reset, status_of

pytestmark = pytest.mark.native

# What an upload's client announces: 2 to the power 37.
ENDLESS = 137438953472
BOUNDARY = "-----------QUENMULTIPART_BOUNDARY-----------"


def call(running, method, path, body=None, headers=None, name=None):
    client = http.client.HTTPConnection("127.0.0.1", running.port(name), timeout=HANG)
    try:
        client.request(method, path, body, headers or {})
        response = client.getresponse()
        return response.status, response.headers, response.read()
    finally:
        client.close()


def soap(command):
    return f"<e:Envelope xmlns:e='x'><e:Body>{command}</e:Body></e:Envelope>"


@pytest.mark.parametrize(
    "path, status, success",
    [
        ("/info.json", 200, True),
        ("/echo.json", 200, True),
        ("/login.json", 200, True),
        ("/refused.json", 200, False),
        ("/missing.json", 200, None),
        ("/text.json", 200, "yes"),
        ("/elsewhere.json", 404, False),
    ],
)
def test_the_json_service_says_success_by_the_path(camera, path, status, success):
    got, headers, body = call(camera("-e", "json"), "GET", path)
    assert (got, json.loads(body).get("success")) == (status, success)
    assert headers["Content-Type"] == "application/json"


def test_the_json_service_tells_what_was_posted(camera):
    _, _, body = call(camera("-e", "json"), "POST", "/echo.json?a=1", "pan=3", {"Cookie": "s=42"})
    told = json.loads(body)
    assert (told["method"], told["query"], told["body"]) == ("POST", "a=1", "pan=3")
    assert told["cookie"] == "s=42"


def test_the_json_service_hands_out_a_cookie(camera):
    _, headers, _ = call(camera("-e", "json"), "GET", "/login.json")
    assert headers["Set-Cookie"].startswith("session=")


def test_the_cgi_service_tells_what_arrived(camera):
    running = camera("-e", "cgi")
    assert call(running, "GET", "/info.cgi")[2].startswith(b"camera=north gate\n")
    told = call(running, "POST", "/text.cgi?q", "pan=3", {"Content-Type": "text/x"})[2].decode()
    assert told == "POST HTTP/1.1\nquery q\ntype text/x\ncookie \nuser \nbody pan=3\n"
    assert "session=42" in call(running, "GET", "/cookie.cgi")[1]["Set-Cookie"]
    assert call(running, "GET", "/other.cgi")[0] == 404


def test_the_soap_device_answers_an_operation(camera):
    status, headers, body = call(camera("-e", "soap"), "POST", "/ptz", soap("<GetPresets/>"))
    assert (status, headers.get_content_type()) == (200, "application/soap+xml")
    presets = [node for node in ElementTree.fromstring(body).iter() if node.tag == "Preset"]
    assert [preset.get("token") for preset in presets] == ["1", "2", "3", "4"]


@pytest.mark.parametrize(
    "body, reason",
    [
        ("", "The body is empty."),
        ("<e:Envelope", "The envelope is not well-formed XML."),
        (soap("<Reboot/>"), 'There is no operation "Reboot".'),
        (soap("<GotoPreset><Token>9</Token></GotoPreset>"), 'There is no preset "9".'),
    ],
)
def test_the_soap_device_sends_a_fault_with_500(camera, body, reason):
    status, _, response = call(camera("-e", "soap"), "POST", "/ptz", body)
    assert status == 500
    nodes = ElementTree.fromstring(response).iter()
    texts = [node.text for node in nodes if node.tag.endswith("Text")]
    assert texts == [reason]


def test_the_store_keeps_what_is_posted_and_put(camera):
    running = camera("-e", "store")
    status, headers, _ = call(running, "POST", "/presets", "<preset><pan>3</pan></preset>")
    assert (status, headers["Location"]) == (201, "/presets/3")
    assert call(running, "GET", "/presets/3")[2] == b"<preset><pan>3</pan></preset>"
    assert call(running, "PUT", "/presets/3", "<preset/>")[0] == 200
    assert call(running, "PUT", "/presets/new", "<preset/>")[0] == 201
    assert call(running, "GET", "/presets/3")[2] == b"<preset/>"
    listed = ElementTree.fromstring(call(running, "GET", "/presets")[2])
    assert [node.get("href") for node in listed] == [
        f"/presets/{name}" for name in ("1", "2", "3", "7", "new")
    ]


def test_the_store_deletes(camera):
    running = camera("-e", "store")
    assert call(running, "DELETE", "/presets/7")[0] == 200
    assert call(running, "GET", "/presets/7")[0] == 404
    assert call(running, "DELETE", "/presets/7")[0] == 404


def test_the_store_refuses_what_is_no_xml(camera):
    running = camera("-e", "store")
    assert call(running, "POST", "/presets", "pan=3")[0] == 400
    assert call(running, "PUT", "/presets/1", "<a>")[0] == 400
    assert call(running, "GET", "/elsewhere")[0] == 404
    assert call(running, "DELETE", "/presets")[0] == 405


def decode_dc(picture):
    """The brightness of each square of a grey JPEG without AC parts. The codes are those of the
    picture's own table: a size in 4 bits, the difference, and one zero bit."""
    data, at = picture, 2
    assert data[:2] == b"\xff\xd8" and data[-2:] == b"\xff\xd9"
    size = {}
    while data[at + 1] != 0xDA:
        length = int.from_bytes(data[at + 2 : at + 4], "big")
        size[data[at + 1]] = data[at + 4 : at + 2 + length]
        at += 2 + length
    height, width = (int.from_bytes(size[0xC0][i : i + 2], "big") for i in (1, 3))
    scan = data[at + 2 + int.from_bytes(data[at + 2 : at + 4], "big") : -2]
    bits = "".join(f"{byte:08b}" for byte in scan.replace(b"\xff\0", b"\xff"))
    levels, level, place = [], 0, 0
    for _ in range(width // 8 * height // 8):
        count = int(bits[place : place + 4], 2)
        value = int(bits[place + 4 : place + 4 + count] or "0", 2)
        if count and value < 1 << (count - 1):
            value -= (1 << count) - 1
        place += 4 + count + 1
        assert bits[place - 1] == "0"
        level += value
        levels.append(level)
    assert set(bits[place:]) <= {"1"} and len(bits) - place < 8
    return width, levels


def test_the_snapshot_is_a_jpeg_whose_bar_moves(camera):
    running = camera("-e", "snapshot,width=64,height=16")
    columns = []
    for _ in range(2):
        status, headers, body = call(running, "GET", "/snapshot.jpg")
        assert (status, headers["Content-Type"]) == (200, "image/jpeg")
        width, levels = decode_dc(body)
        columns.append(levels.index(100))
        assert (width, len(levels)) == (64, 16)
    assert columns == [0, 1]


def test_the_live_pictures_come_in_parts_and_end_where_asked(camera):
    running = camera("-e", "multipart,frames=3,rate=100")
    seen = running.ask(b"GET /live.mjpg HTTP/1.1\r\n\r\n")
    assert headers_of(seen.bytes, "Content-Type") == [
        "multipart/x-mixed-replace; boundary=camera-frame"
    ]
    parts = body_of(seen.bytes).split(b"--camera-frame")
    assert len(parts) == 5 and parts[4] == b"--\r\n"
    for part in parts[1:4]:
        head, _, picture = part.partition(b"\r\n\r\n")
        assert f"Content-Length: {len(picture) - 2}".encode() in head
        decode_dc(picture[:-2])


def test_live_pictures_without_an_end_go_on_until_the_client_leaves(camera):
    running = camera("-e", "multipart,rate=100")
    with running.connect() as client:
        client.sendall(b"GET /live.mjpg HTTP/1.0\r\n\r\n")
        data = b""
        while data.count(b"--camera-frame") < 20:
            data += client.recv(65536)
        reset(client)
    assert running.journal()[0]["end"] == "peer-reset"


def upload_head(length=ENDLESS):
    return (
        f"POST /clip HTTP/1.1\r\nHost: camera\r\n"
        f"Content-Type: multipart/form-data; boundary={BOUNDARY}\r\n"
        f"Content-Length: {length}\r\nCache-Control :no-cache\r\nConnection: keep-alive\r\n\r\n"
    ).encode()


def test_an_upload_of_announced_128_gib_is_counted_up_to_its_closing_boundary(camera):
    running = camera("-e", "upload")
    body = f"--{BOUNDARY}\r\n\r\n".encode() + bytes(1 << 20) + f"\r\n--{BOUNDARY}--\r\n".encode()
    with running.connect() as client:
        client.sendall(upload_head())
        for at in range(0, len(body) - 30, 99991):
            client.sendall(body[at : min(at + 99991, len(body) - 30)])
        client.sendall(body[-30:-7])  # the boundary in two parts
        client.sendall(body[-7:])
        seen = read_all(client, HANG)
    count, end = body_of(seen.bytes).split()
    # The CRLF after the boundary may come too late to be counted.
    assert int(count) in (len(body), len(body) - 2) and end == b"closed"
    assert running.journal()[0]["requests"][0]["sloppy"] == "blank in front of a colon"


def test_an_upload_ends_where_its_client_closes_its_direction(camera):
    running = camera("-e", "upload")
    with running.connect() as client:
        client.sendall(upload_head() + b"x" * 1000)
        client.shutdown(socket.SHUT_WR)
        seen = read_all(client, HANG)
    assert (status_of(seen.bytes), body_of(seen.bytes)) == (200, b"1000 cut\n")


def test_an_upload_can_be_responded_to_after_a_number_of_bytes(camera):
    running = camera("-e", "upload,after=1000")
    seen = running.ask(upload_head() + b"x" * 1000)
    assert body_of(seen.bytes) == b"1000 full\n"


def test_an_upload_with_an_honest_length_ends_there(camera):
    seen = camera("-e", "upload").ask(upload_head(length=5) + b"hello")
    assert body_of(seen.bytes) == b"5 full\n"


@pytest.mark.parametrize("directory", ["", "/basic", "/digest"])
def test_the_site_asks_for_the_credentials_of_its_directories(camera, directory):
    running = camera("-e", "site")
    url = running.url(f"{directory}/info.json")
    if directory:
        with pytest.raises(urllib.error.HTTPError) as refused:
            urllib.request.urlopen(url, timeout=HANG)
        assert refused.value.code == 401
    passwords = urllib.request.HTTPPasswordMgrWithDefaultRealm()
    passwords.add_password(None, url, "operator", "gate-7")
    opener = urllib.request.build_opener(
        urllib.request.HTTPBasicAuthHandler(passwords),
        urllib.request.HTTPDigestAuthHandler(passwords),
    )
    response = opener.open(url, timeout=HANG).read()
    assert response == b'{"camera":"north gate","success":true}\n'


def test_the_site_tells_what_came_in_each_form(camera):
    running = camera("-e", "site")
    assert b"body pan=3\n" in call(running, "POST", "/text.cgi", "pan=3")[2]
    assert json.loads(call(running, "POST", "/", "pan=3")[2])["body"] == "pan=3"
    document = "<?xml version='1.0'?>\n<preset/>\n"
    response = call(running, "PUT", "/xml.cgi", document)[2]
    assert ElementTree.fromstring(response).find("preset") is not None
    assert call(running, "GET", "/xml.cgi?fault")[0] == 500
    assert call(running, "GET", "/nothing.json")[0] == 404


def test_the_site_keeps_the_posted_form(camera, tmp_path):
    posted = tmp_path / "posted"
    running = camera("-e", f"site,posted={posted}", "--access", tmp_path / "access")
    assert call(running, "POST", "/command.sh?x", "zoom=3&focus=near")[2] == b"ok\n"
    assert posted.read_text() == "zoom=3&focus=near"
    assert (tmp_path / "access").read_text() == "POST /command.sh 200\n"


def test_the_site_counts_an_upload(camera):
    seen = camera("-e", "site").ask(
        upload_head().replace(b"/clip", b"/count.cgi") + f"x--{BOUNDARY}--".encode()
    )
    assert body_of(seen.bytes) == f"{5 + len(BOUNDARY)} closed\n".encode()


def test_a_connection_of_http_1_1_is_kept_and_one_of_http_1_0_is_closed(camera):
    running = camera("-e", "json")
    client = http.client.HTTPConnection("127.0.0.1", running.port(), timeout=HANG)
    for _ in range(3):
        client.request("GET", "/info.json")
        assert client.getresponse().read()
    client.close()
    assert running.ask(GET).end == "close"
    counts = {entry["connection"]: len(entry["requests"]) for entry in running.journal(2)}
    assert counts == {1: 3, 2: 1}


@pytest.mark.parametrize("name", [b"Connection", b"CONNECTION"])
def test_a_close_with_a_semicolon_closes_and_is_noted(camera, name):
    request = b"GET /info.json HTTP/1.1\r\nHost: x\r\n" + name + b": close;\r\n\r\n"
    running = camera("-e", "json")
    seen = running.ask(request)
    assert (status_of(seen.bytes), seen.end) == (200, "close")
    sloppy = running.journal()[0]["requests"][0]["sloppy"]
    assert sloppy == "semicolon after Connection's value"


def test_a_head_request_gets_no_body(camera):
    seen = camera("-e", "json").ask(b"HEAD /info.json HTTP/1.0\r\n\r\n")
    assert status_of(seen.bytes) == 200 and body_of(seen.bytes) == b""


def test_a_chunked_request_is_decoded(camera):
    request = (
        b"POST /echo.json HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n"
        b"Connection: close\r\n\r\n3\r\npan\r\n2\r\n=3\r\n0\r\n\r\n"
    )
    assert json.loads(body_of(camera("-e", "json").ask(request).bytes))["body"] == "pan=3"


def test_an_expected_continue_is_sent(camera):
    running = camera("-e", "json")
    with running.connect() as client:
        client.sendall(
            b"POST /echo.json HTTP/1.1\r\nHost: x\r\nContent-Length: 5\r\n"
            b"Expect: 100-continue\r\nConnection: close\r\n\r\n"
        )
        assert client.recv(100) == b"HTTP/1.1 100 Continue\r\n\r\n"
        client.sendall(b"pan=3")
        assert json.loads(body_of(read_all(client, HANG).bytes))["body"] == "pan=3"


def test_what_is_no_http_gets_400_with_the_reason(camera):
    running = camera("-e", "json")
    seen = running.ask(b"HELLO\r\n\r\n")
    assert status_of(seen.bytes) == 400 and body_of(seen.bytes).startswith(b"Bad request: ")
    assert running.journal()[0]["requests"][0]["sloppy"]


@pytest.mark.skipif(not shutil.which("curl"), reason="curl is not installed")
def test_curl_talks_to_every_standard_endpoint(camera):
    running = camera()
    paths = {
        "json": "/info.json",
        "json-tls": "/info.json",
        "cgi": "/info.cgi",
        "cgi-basic": "/info.cgi",
        "cgi-digest": "/info.cgi",
        "store": "/presets/1",
        "snapshot": "/snapshot.jpg",
        "site": "/digest/info.json",
        "site-tls": "/basic/info.json",
    }
    for name, path in paths.items():
        command = ["curl", "-sS", "-f", "--noproxy", "*", "--anyauth", "-u", "operator:gate-7"]
        command += ["--cacert", running.report["ca"], "-m", str(HANG), running.url(path, name)]
        done = subprocess.run(command, capture_output=True, check=False)
        assert (name, done.returncode, done.stderr) == (name, 0, b"")
        assert done.stdout
    assert {"soap", "multipart", "upload"} | set(paths) == set(running.endpoints)
