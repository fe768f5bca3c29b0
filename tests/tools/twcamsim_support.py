"""A simulated camera for a test, and clients that see each byte of it."""

import collections
import hashlib
import json
import socket
import ssl
import struct

import pytest

from conftest import HANG, wait_until

GET = b"GET /info.json HTTP/1.0\r\n\r\n"
GET_11 = b"GET /info.json HTTP/1.1\r\nHost: camera\r\nConnection: close\r\n\r\n"

# How a connection ended, as its client saw it: "close", "reset", "silent" or, over TLS, "cut".
Seen = collections.namedtuple("Seen", "bytes end")


class Camera:
    def __init__(self, child, journal):
        self.child = child
        self.journal_path = journal
        line = child.stdout.readline()
        assert line, child.stderr.read()
        self.report = json.loads(line)
        self.endpoints = {entry["name"]: entry for entry in self.report["endpoints"]}

    def endpoint(self, name=None):
        return self.endpoints[name] if name else self.report["endpoints"][0]

    def port(self, name=None):
        return self.endpoint(name)["port"]

    def url(self, path, name=None):
        return self.endpoint(name)["url"].rstrip("/") + path

    def connect(self, name=None):
        return socket.create_connection(("127.0.0.1", self.port(name)), timeout=HANG)

    def tls_context(self):
        """Trusts the printed authority, and tells an end without close notice from one with it."""
        context = ssl.create_default_context(cafile=self.report["ca"])
        context.options &= ~ssl.OP_IGNORE_UNEXPECTED_EOF
        return context

    def ask(self, request=GET, name=None, silence=HANG, least=0):
        """Sends the request and reads to the connection's end, or until nothing comes for
        `silence` seconds after the first `least` bytes."""
        with self.connect(name) as client:
            try:
                client.sendall(request)
            except ConnectionResetError:
                return Seen(b"", "reset")  # a reset is told once
            except BrokenPipeError:
                pass  # the peer's end is for read_all to tell
            return read_all(client, silence, least)

    def ask_tls(self, request=GET, name=None):
        """The same over TLS. An end without TLS's close notice is "cut"."""
        with self.connect(name) as raw:
            raw.settimeout(HANG)
            return TlsPump(raw, self.tls_context()).ask(request)

    def journal(self, lines=1):
        """The `lines` connections of the journal by their numbers, as soon as all have ended."""

        def complete():
            text = self.journal_path.read_text() if self.journal_path.exists() else ""
            return text if text.count("\n") >= lines else None

        text = wait_until(complete, f"{lines} line(s) of the journal")
        entries = [json.loads(line) for line in text.splitlines()]
        return sorted(entries, key=lambda entry: entry["connection"])

    def end(self):
        self.child.terminate()
        return self.child.wait(timeout=HANG)


class TlsPump:
    """TLS over a socket by hand, because the usual wrapper takes a reset for an end."""

    def __init__(self, raw, context):
        self.raw = raw
        self.incoming, self.outgoing = ssl.MemoryBIO(), ssl.MemoryBIO()
        self.tls = context.wrap_bio(self.incoming, self.outgoing, server_hostname="127.0.0.1")

    def pump(self, call, *args):
        """Calls until it needs nothing from the peer any more."""
        while True:
            try:
                return call(*args)
            except ssl.SSLWantReadError:
                self.raw.sendall(self.outgoing.read())
                piece = self.raw.recv(65536)
                self.incoming.write(piece)
                if not piece:
                    self.incoming.write_eof()
            finally:
                if self.outgoing.pending:
                    self.raw.sendall(self.outgoing.read())

    def ask(self, request):
        self.pump(self.tls.do_handshake)
        self.pump(self.tls.write, request)
        data = b""
        try:
            while piece := self.pump(self.tls.read, 65536):
                data += piece
        except ConnectionResetError:
            return Seen(data, "reset")
        except ssl.SSLZeroReturnError:
            return Seen(data, "close")
        except ssl.SSLError:
            return Seen(data, "cut")
        return Seen(data, "close")


@pytest.fixture
def camera(start, tmp_path):
    """camera(*args): a running twcamsim whose journal is kept."""
    count = 0

    def make(*args):
        nonlocal count
        count += 1
        journal = tmp_path / f"journal-{count}"
        # The fixture kills it, so its directory must be in one that goes away.
        place = {"TMPDIR": str(tmp_path)}
        return Camera(start("twcamsim", "--journal", journal, *args, env=place), journal)

    return make


def read_all(client, silence, least=0):
    data = b""
    while True:
        client.settimeout(HANG if len(data) < least else silence)
        try:
            piece = client.recv(65536)
        except ConnectionResetError:
            return Seen(data, "reset")
        except TimeoutError:
            return Seen(data, "silent")
        if not piece:
            return Seen(data, "close")
        data += piece


def reset(client):
    """Ends a connection by a reset."""
    client.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, struct.pack("ii", 1, 0))
    client.close()


def head_of(data):
    return data.partition(b"\r\n\r\n")[0].decode("latin-1")


def body_of(data):
    return data.partition(b"\r\n\r\n")[2]


def status_of(data):
    return int(data.split(b" ", 2)[1])


def headers_of(data, name):
    """The values of all headers of that name."""
    lines = head_of(data).split("\r\n")[1:]
    pairs = [line.partition(":") for line in lines]
    return [value.strip() for key, _, value in pairs if key.lower() == name.lower()]


def md5(text):
    return hashlib.md5(text.encode()).hexdigest()


def challenge_words(challenge):
    """The parameters of one Digest challenge."""
    words = {}
    rest = challenge.partition(" ")[2]
    while rest.strip(" ,"):
        name, _, rest = rest.lstrip(" ,").partition("=")
        if rest.startswith('"'):
            value, _, rest = rest[1:].partition('"')
        else:
            value, _, rest = rest.partition(",")
        words[name.strip().lower()] = value.strip()
    return words


# What Digest credentials are made of; a test replaces what it wants wrong.
USUAL = {
    "user": "operator",
    "password": "gate-7",
    "method": "GET",
    "uri": "/info.cgi",
    "nc": "00000001",
    "cnonce": "5f3d9c",
    "body": "",
}


def digest_response(words, parts, qop):
    """RFC 2617's arithmetic; without qop, RFC 2069's."""
    ha1 = md5(f"{parts['user']}:{words['realm']}:{parts['password']}")
    if words.get("algorithm") == "MD5-sess":
        ha1 = md5(f"{ha1}:{words['nonce']}:{parts['cnonce']}")
    ha2_text = f"{parts['method']}:{parts['uri']}"
    if qop == "auth-int":
        ha2_text += ":" + md5(parts["body"])
    middle = f":{parts['nc']}:{parts['cnonce']}:{qop}" if qop else ""
    return md5(f"{ha1}:{words['nonce']}{middle}:{md5(ha2_text)}")


def digest_line(words, qop="auth", **changes):
    """The Authorization line for a challenge."""
    parts = {**USUAL, **changes}
    response = parts.get("response") or digest_response(words, parts, qop)
    line = (
        f'Authorization: Digest username="{parts["user"]}", realm="{words["realm"]}", '
        f'nonce="{words["nonce"]}", uri="{parts["uri"]}", response="{response}"'
    )
    if qop:
        line += f', qop={qop}, nc={parts["nc"]}, cnonce="{parts["cnonce"]}"'
    if "opaque" in words:
        line += f', opaque="{words["opaque"]}"'
    if "algorithm" in words:
        line += f", algorithm={words['algorithm']}"
    return line


def request_with(line, target="/info.cgi", method="GET", body=""):
    length = f"Content-Length: {len(body)}\r\n" if body else ""
    return f"{method} {target} HTTP/1.0\r\n{line}\r\n{length}\r\n{body}".encode()


# How long a client waits before it takes a silence for one, after all that must come.
SILENCE = 1.0
HEAD = b"HTTP/1.1 200 OK\r\n"


def ask(camera, *faults, endpoint="json", silence=HANG, request=GET):
    """What a client sees of a camera with these faults."""
    words = [word for fault in faults for word in ("-f", fault)]
    return camera("-e", endpoint, *words).ask(request, silence=silence)


def usual(camera):
    """The same without a fault."""
    return camera("-e", "json").ask().bytes
