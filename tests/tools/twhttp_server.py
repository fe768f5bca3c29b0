"""Scripted servers for the tests of twhttp: each connection plays the next script of a list."""

import socket
import ssl
import struct
import subprocess
import threading

HANG = 120
LONGEST_BODY = 1 << 26


class Script:
    """What one connection is sent: pieces of bytes, and how it ends: "close", "reset" or "hold"
    (it stays open and silent until the client goes). `read` False sends before the request is
    read, `until` when these bytes have come; `times` requests are served over one connection."""

    def __init__(self, *pieces, end="close", read=True, until=None, times=1):
        self.pieces = pieces
        self.end = end
        self.read = read
        self.until = until
        self.times = times


def response(body=b"", status="200 OK", headers=()):
    """A response with its length."""
    lines = [f"HTTP/1.1 {status}", *headers, f"Content-Length: {len(body)}", "", ""]
    return "\r\n".join(lines).encode() + body


def challenge(text, status="401 Unauthorized"):
    return response(b"no", status, [f"WWW-Authenticate: {text}", "Connection: close"])


def announced_length(head):
    for line in head.split(b"\r\n")[1:]:
        name, _, value = line.partition(b":")
        if name.strip().lower() == b"content-length":
            return int(value)
    return 0


class Peer:
    """Listens on 127.0.0.1 until it is closed; `requests` holds what came, a request an entry. An
    Script repeats for the connections after the last one."""

    def __init__(self, *scripts, tls=None):
        self.scripts = [a if isinstance(a, Script) else Script(a) for a in scripts]
        self.tls = tls
        self.requests = []
        self.connections = 0
        self.closed = 0
        self.arrived = threading.Event()
        self.listener = socket.create_server(("127.0.0.1", 0))
        self.port = self.listener.getsockname()[1]
        self.open = []
        self.thread = threading.Thread(target=self.accept, daemon=True)
        self.thread.start()

    def url(self, path="", login=""):
        scheme = "https" if self.tls else "http"
        return f"{scheme}://{login + '@' if login else ''}127.0.0.1:{self.port}/{path}"

    def accept(self):
        while True:
            try:
                connection, _ = self.listener.accept()
            except OSError:
                return
            connection.settimeout(HANG)
            script = self.scripts[min(self.connections, len(self.scripts) - 1)]
            self.connections += 1
            try:
                self.serve(connection, script)
            except (OSError, ssl.SSLError):
                connection.close()

    def serve(self, connection, script):
        if self.tls:
            connection = self.tls.wrap_socket(connection, server_side=True)
        self.open.append(connection)
        for _ in range(script.times):
            if script.read and not self.read_request(connection, script.until):
                break
            for piece in script.pieces:
                connection.sendall(piece() if callable(piece) else piece)
        self.end(connection, script.end)

    def read_request(self, connection, until):
        data = b""
        while (until or b"\r\n\r\n") not in data:
            part = connection.recv(65536)
            if not part:
                return False
            data += part
        if until:
            self.arrived.set()
            return True
        head, _, body = data.partition(b"\r\n\r\n")
        length = announced_length(head)
        multipart = length > LONGEST_BODY
        while len(body) < length and not (multipart and body.endswith(b"--\r\n")):
            part = connection.recv(65536)
            if not part:
                break
            body += part
        self.requests.append(head + b"\r\n\r\n" + body)
        self.arrived.set()
        return True

    def end(self, connection, how):
        if how == "reset":
            connection.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, struct.pack("ii", 1, 0))
        if how == "hold":
            while connection.recv(65536):
                pass
        connection.close()
        self.closed += 1

    def close(self):
        # A shutdown wakes the accept; the connections that are held end with it.
        self.listener.shutdown(socket.SHUT_RDWR)
        for connection in self.open:
            try:
                connection.shutdown(socket.SHUT_RDWR)
            except OSError:
                pass
        self.thread.join(HANG)
        self.listener.close()
        assert not self.thread.is_alive()


def make_identity(directory, name="127.0.0.1", days=1):
    """A key and a certificate of its own making; a TLS context that shows it."""
    key, certificate = directory / "key.pem", directory / "certificate.pem"
    subject = ["-subj", f"/CN={name}", "-addext", f"subjectAltName=IP:{name}"]
    subprocess.run(
        ["openssl", "req", "-x509", "-nodes"]
        + ["-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256"]
        + ["-keyout", key, "-out", certificate, "-days", str(days), *subject],
        check=True,
        capture_output=True,
    )
    context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
    context.load_cert_chain(certificate, key)
    return context, certificate


def closed_port():
    """A port that nobody listens at."""
    with socket.create_server(("127.0.0.1", 0)) as server:
        return server.getsockname()[1]
