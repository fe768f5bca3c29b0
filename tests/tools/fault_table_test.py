#!/usr/bin/python3
"""twhttp against each profile, style of authentication and fault of twcamsim: what it says names the
true cause. Run as a program, it prints the table with what twhttp said, in Markdown:

    scripts/sandbox python3 tests/tools/fault_table_test.py
"""

import json
import pathlib
import subprocess
import sys

import pytest

pytestmark = pytest.mark.native

LOGIN = "operator:gate-7@"
TRUSTED = pathlib.Path("/etc/ssl/certs/ca-certificates.crt")
GET = ("get", "--direct", "--timeout", "1")
CURL = ("curl-get", "--timeout", "1")
JSON = ("json-get", "--timeout", "1")
JSONS = ("json-gets", "--timeout", "2")
TLS = ("get", "--give-up", "2s")
ENVELOPE = (
    '<s:Envelope xmlns:s="http://www.w3.org/2003/05/soap-envelope">'
    "<s:Body><GetPresets/></s:Body></s:Envelope>"
)
SOAP = ("soap", "--direct", "--timeout", "1", "-d", ENVELOPE)
SOAP_XML = ("soap-xml", "--direct", "--timeout", "1", "-d", ENVELOPE)
UNKNOWN = ("soap", "--direct", "--timeout", "1", "-d", "<a/>")
XML = ("xml-get", "--timeout", "1")
PUT = ("xml-put", "-d", "<preset/>")

# Where each profile's resources are.
PATHS = {"json": "info.json", "store": "presets/7", "soap": "ptz", "upload": "clip"}

# (profile with its options, the words of twhttp, the class, a phrase of standard error)
PROFILES = [
    ("json", JSON, "done", ""),
    ("json,tls", JSONS, "done", ""),
    ("cgi", GET, "done", ""),
    ("cgi", CURL, "done", ""),
    ("cgi-basic", GET, "done", ""),
    ("cgi-basic", CURL, "done", ""),
    ("cgi-digest", GET, "done", ""),
    ("cgi-digest", CURL, "login-refused", "sent by Basic, and the peer wants Digest"),
    ("soap", SOAP, "done", ""),
    ("soap", SOAP_XML, "done", ""),
    ("soap", UNKNOWN, "status", "500 Internal Server Error"),
    ("store", XML, "done", ""),
    ("store", PUT, "done", ""),
    ("upload", ("upload", "-d", "clip"), "done", ""),
]

LOGINS = [
    ("basic", "done", ""),
    ("digest", "done", ""),
    ("digest-no-qop", "done", ""),
    ("digest-qop-list", "login-refused", "auth-int"),
    ("digest-qop-list-auth-first", "done", ""),
    ("digest-auth-int", "login-refused", "asks for qop auth-int"),
    ("digest-opaque", "done", ""),
    ("digest-algorithm", "done", ""),
    ("digest-algorithm-quoted", "done", ""),
    ("digest-md5-sess", "login-refused", "MD5-sess, which the library computes as plain MD5"),
    ("digest-odd-order", "done", ""),
    ("digest-unquoted", "done", ""),
    ("digest-stale", "login-refused", "calls the nonce stale"),
    ("digest-strict", "done", ""),
    ("digest-strict-algorithm", "login-refused", "quotes the algorithm"),
    ("digest-or-basic", "done", ""),
    ("basic-or-digest", "done", ""),
    ("digest-and-basic", "done", ""),
]

# (fault, profile, the words of twhttp, the class, a phrase of standard error)
FAULTS = [
    ("refuse", "cgi", GET, "refused", "nothing listens there"),
    ("black-hole", "cgi", GET, "connect-timeout", "a firewall drops the packets"),
    ("slow-accept=200", "cgi", GET, "done", ""),
    ("close-at-once", "cgi", GET, "no-reply", "0 bytes came before that"),
    ("reset-at-once", "cgi", GET, "reset", "Connection reset by peer"),
    ("never-read", "cgi", GET, "read-timeout", "0 bytes came, then nothing"),
    ("close-in-request", "cgi", GET, "no-reply", "0 bytes came before that"),
    ("close-after-request", "cgi", GET, "no-reply", "0 bytes came before that"),
    ("reset-after-request", "cgi", GET, "reset", "Connection reset by peer"),
    ("read-slowly", "cgi", GET, "done", ""),
    ("reset-at=100", "cgi", GET, "reset", "100 bytes came before that"),
    ("cut-at", "cgi", GET, "no-reply", "0 bytes came before that"),
    ("cut-head=30", "cgi", GET, "malformed-head", "the peer closed in the middle of the head"),
    ("cut-body=10", "cgi", GET, "cut-body", "39 bytes were announced and 10 came"),
    ("cut-body=10", "cgi", CURL, "cut-body", "39 bytes were announced and 10 came"),
    ("tls-stall", "json,tls", TLS, "tls", "says nothing in the handshake"),
    ("tls-stall", "json,tls", JSONS, "tls", "says nothing in the handshake"),
    ("tls-garbage", "json,tls", TLS, "tls", "speaks no TLS"),
    ("tls-plain", "json,tls", TLS, "tls", "the port speaks plain HTTP"),
    ("tls-close", "json,tls", TLS, "tls", "closed the connection in the handshake"),
    ("tls-reset", "json,tls", TLS, "tls", "closed the connection in the handshake"),
    ("tls-cut", "json,tls", TLS, "tls", "closed the connection in the handshake"),
    ("tls-alert", "json,tls", TLS, "tls", "share no cipher"),
    ("tls-old", "json,tls", TLS, "tls", "versions of TLS that are switched off here"),
    ("no-close-notice", "json,tls", TLS, "done", "closed without TLS's close notice"),
    ("cert-expired", "json,tls", JSONS, "certificate", "1. the certificate has expired"),
    ("cert-not-yet", "json,tls", JSONS, "certificate", "1. the certificate is not valid yet"),
    ("cert-foreign", "json,tls", JSONS, "certificate", "1. who issued the certificate is not"),
    ("cert-wrong-name", "json,tls", JSONS, "certificate", "1. the certificate is made out to"),
    ("cert-self-signed", "json,tls", JSONS, "certificate", "of the peer's own making"),
    ("stall-before-status", "cgi", GET, "read-timeout", "0 bytes came, then nothing"),
    ("stall-before-status", "cgi", CURL, "read-timeout", "0 bytes came in time"),
    ("stall-in-status", "cgi", GET, "read-timeout", "8 bytes came, then nothing"),
    ("stall-after-status", "cgi", GET, "read-timeout", "17 bytes came, then nothing"),
    ("stall-in-head", "cgi", GET, "read-timeout", "phase    head"),
    ("stall-after-head", "cgi", GET, "read-timeout", "phase    body"),
    ("stall-in-body=5", "cgi", GET, "read-timeout", "phase    body"),
    ("stall-at-end", "cgi", GET, "kept-open", "the body was complete"),
    ("slow", "cgi", GET, "done", ""),
    ("stall-after-request", "cgi", GET, "read-timeout", "0 bytes came, then nothing"),
    ("length-too-long", "cgi", GET, "cut-body", "49 bytes were announced and 39 came"),
    ("length-too-short", "cgi", GET, "done", "5 bytes came after the announced end"),
    ("length-too-short", "cgi", CURL, "done", "5 bytes came after the announced end"),
    ("length-missing", "cgi", GET, "done", ""),
    ("length-missing", "soap", SOAP, "no-length", "Content-Length"),
    ("length-double", "cgi", GET, "cut-body", "more than one Content-Length"),
    ("length-negative", "cgi", GET, "done", "Content-Length: -1 is no length"),
    ("length-negative", "cgi", CURL, "malformed-head", "Invalid Content-Length"),
    ("length-zero", "cgi", GET, "done", "39 bytes came after the announced end"),
    ("length-huge", "cgi", GET, "cut-body", "were announced and 39 came"),
    ("length-text", "cgi", GET, "done", "is no length"),
    ("length-empty", "cgi", GET, "done", "an empty Content-Length line"),
    ("chunk-bad-size", "cgi", GET, "cut-body", "in place of a chunk's size"),
    ("chunk-empty-size", "cgi", GET, "cut-body", "in place of a chunk's size"),
    ("chunk-overflow", "cgi", GET, "cut-body", "of a chunk did not come"),
    ("chunk-negative", "cgi", GET, "cut-body", "in place of a chunk's size"),
    ("chunk-too-long", "cgi", GET, "cut-body", "of a chunk did not come"),
    ("chunk-upper-case", "cgi", GET, "done", ""),
    ("chunk-no-line-end", "cgi", GET, "cut-body", "of the CRLF after it"),
    ("chunk-no-last", "cgi", GET, "cut-body", "the last chunk did not come"),
    ("chunk-extension", "cgi", GET, "done", ""),
    ("chunk-trailer", "cgi", GET, "done", ""),
    ("chunk-and-length", "cgi", GET, "done", "a Content-Length beside a Transfer-Encoding"),
    ("chunks", "cgi", GET, "done", ""),
    ("no-status-line", "cgi", GET, "malformed-head", 'begins with "Content-Type'),
    ("http-2-status", "cgi", GET, "malformed-head", 'begins with "HTTP/2.0 200 OK"'),
    ("other-protocol", "cgi", GET, "malformed-head", 'begins with "220 camera service'),
    ("other-protocol", "cgi", CURL, "malformed-head", "Received HTTP/0.9"),
    ("status-code", "cgi", GET, "malformed-head", "no status of three digits: HTTP/1.1 2OO"),
    ("no-code", "cgi", GET, "malformed-head", "no status of three digits"),
    ("no-reason", "cgi", GET, "done", ""),
    ("long-status", "cgi", GET, "malformed-head", "the library cuts a line at 2,047 bytes"),
    ("informational", "cgi", GET, "malformed-head", "an interim response"),
    ("informational", "cgi", CURL, "done", ""),
    ("bare-lf", "cgi", GET, "done", "end in a bare line feed"),
    ("cr-only", "cgi", GET, "malformed-head", "the peer closed in the middle of the head"),
    ("head-lines", "cgi", GET, "malformed-head", "103 header lines: the library reads 30"),
    ("head-lines", "cgi", CURL, "done", ""),
    ("head-lines-first", "cgi", GET, "malformed-head", "103 header lines: the library reads 30"),
    ("long-line", "cgi", GET, "malformed-head", "the library cuts a line at 2,047 bytes"),
    ("no-colon", "cgi", GET, "done", "a header line without a colon"),
    ("empty-name", "cgi", GET, "done", "begins with its colon"),
    ("only-colon", "cgi", GET, "malformed-head", "without a name"),
    ("folded-header", "cgi", GET, "done", ""),
    ("zero-in-head", "cgi", GET, "done", "zero bytes in the head"),
    ("lower-case-head", "cgi", GET, "done", ""),
    ("blank-before-colon", "cgi", GET, "done", ""),
    ("no-blank-line", "cgi", GET, "malformed-head", "before its empty line"),
    ("status", "cgi", GET, "status", "the peer failed"),
    ("status=404", "cgi", GET, "status", "the path does not exist there"),
    ("redirect", "cgi", GET, "status", "redirects to /info.cgi"),
    ("endless-401", "cgi-digest", GET, "login-refused", "1. user or password is wrong"),
    ("nonce-changing", "cgi-digest", GET, "login-refused", "has another nonce each time"),
    ("stale", "cgi-digest", GET, "login-refused", "calls the nonce stale"),
    ("stale", "cgi-digest", XML, "login-refused", "calls the nonce stale"),
    ("no-realm", "cgi-digest", GET, "login-refused", "1. the challenge has no realm"),
    ("no-nonce", "cgi-digest", GET, "login-refused", "1. the challenge has no nonce"),
    ("no-nonce", "cgi-digest", XML, "login-wanted", "1. the challenge has no nonce"),
    ("no-challenge", "cgi-digest", GET, "login-wanted", "its head has no WWW-Authenticate"),
    ("other-scheme", "cgi-digest", GET, "login-wanted", "the peer offers Bearer"),
    ("other-qop", "cgi-digest", GET, "done", ""),
    ("other-algorithm", "cgi-digest", GET, "login-refused", "1. the peer asks for SHA-256"),
    ("forbidden", "cgi-digest", GET, "status", "the credentials are good and may not do that"),
    ("xml-bomb", "store", XML, "xml", "1. the document's entities multiply"),
    ("xml-deep", "store", XML, "xml", "1. the document is nested more deeply"),
    ("xml-broken", "store", XML, "xml", "tag mismatch"),
    ("html-page", "json", JSON, "json", "1. the peer responded with a page for people"),
    ("json-bomb", "json", JSON, "json", "1. it is nested more deeply than is allowed"),
    ("json-broken", "json", JSON, "json", "Line 1"),
    ("success-false", "json", JSON, "not-success", '"success" is false'),
    ("success-missing", "json", JSON, "not-success", 'the member "success" is missing'),
    ("success-text", "json", JSON, "not-success", '"success" is "yes"'),
    ("json-array", "json", JSON, "not-success", "the response is no object"),
    ("wrong-charset", "json", JSON, "done", ""),
    ("empty-body", "json", JSON, "empty-body", "has no body"),
    ("zero-bytes", "json", JSON, "done", ""),
    ("byte-order-mark", "json", JSON, "json", "1. the body begins with a byte order mark"),
    ("wrong-type", "json", JSON, "done", ""),
    ("false-gzip", "json", JSON, "done", "Content-Encoding: gzip: the library decodes none"),
    ("big-body", "cgi", GET, "done", ""),
    ("extra-bytes", "json", JSON, "done", "bytes came after the announced end"),
]


def all_rows():
    """(name, endpoint's options, words, class, phrase) of each row."""
    for profile, words, kind, phrase in PROFILES:
        yield f"profile {profile}", profile, words, kind, phrase
    for login, kind, phrase in LOGINS:
        yield f"login {login}", f"cgi,login={login}", GET, kind, phrase
    for fault, profile, words, kind, phrase in FAULTS:
        yield fault, f"{profile},fault={fault.replace('=', ':')}", words, kind, phrase


ROWS = list(all_rows())


class Camera:
    """One twcamsim with an endpoint for each row."""

    def __init__(self, command):
        words = []
        for number, row in enumerate(ROWS):
            words += ["--endpoint", f"{row[1]},name=row-{number}"]
        self.child = subprocess.Popen(
            command("twcamsim", "--seed", 1, *words), stdout=subprocess.PIPE, encoding="utf-8"
        )
        report = json.loads(self.child.stdout.readline())
        self.authority = report["ca"]
        self.endpoints = {entry["name"]: entry for entry in report["endpoints"]}

    def url(self, number):
        endpoint = self.endpoints[f"row-{number}"]
        path = PATHS.get(endpoint["profile"], "info.cgi")
        login = "" if ROWS[number][2][0].startswith(("json", "soap", "upload")) else LOGIN
        return endpoint["url"].replace("://", f"://{login}") + path

    def close(self):
        self.child.terminate()
        self.child.wait(60)
        self.child.stdout.close()


def trust(authority):
    """libcurl believes the system's list alone; within the sandbox it is the camera's authority."""
    subprocess.run(["mount", "--bind", authority, TRUSTED], check=True)


def distrust():
    subprocess.run(["umount", TRUSTED], check=True)


@pytest.fixture(scope="module")
def camera(command):
    if not TRUSTED.exists():
        pytest.fail(f"{TRUSTED} is missing (package ca-certificates)")
    each = Camera(command)
    trust(each.authority)
    yield each
    distrust()
    each.close()


@pytest.fixture(scope="module")
def codes(run):
    """Exit codes by class."""
    lines = run("twhttp", "codes").stdout.splitlines()
    return {line.split()[1]: int(line.split()[0]) for line in lines}


@pytest.mark.parametrize("number", range(len(ROWS)), ids=[f"{r[0]}-{r[2][0]}" for r in ROWS])
def test_the_explanation_names_the_cause(run, camera, codes, number):
    _, _, words, kind, phrase = ROWS[number]
    result = run("twhttp", *words, camera.url(number))
    assert result.returncode == codes[kind], result.stderr
    assert phrase in result.stderr


def test_each_fault_and_each_style_of_authentication_has_its_row(run):
    for option, rows in (("faults", FAULTS), ("logins", LOGINS)):
        listed = run("twcamsim", f"--list-{option}", "--json").stdout.splitlines()
        names = {json.loads(line)["name"] for line in listed} - {"none"}
        assert names == {row[0].partition("=")[0] for row in rows}


def said(stderr):
    """The class, what was seen, the first cause."""
    lines = stderr.splitlines()
    heads = [line.split(": ")[1] for line in lines if line.startswith("twhttp: ")]
    kind = next((head for head in heads if head != "note"), "")
    facts = [line[11:].strip() for line in lines if line[:11] in ("  seen     ", "  system   ")]
    cause = [line.partition("1. ")[2] for line in lines if line.startswith("  causes")]
    notes = [line.partition("note: ")[2] for line in lines if line.startswith("twhttp: note: ")]
    return kind, "; ".join(facts + cause + notes)


def print_table():
    from conftest import ROOT, plain_environment
    import os

    directory = pathlib.Path(os.environ.get("TARNWICK_TOOLS_DIR", ROOT / "build/debug/tools"))

    def command(tool, *words):
        return [str(directory / tool / tool), *map(str, words)]

    each = Camera(command)
    trust(each.authority)
    print("| twcamsim | twhttp | exit | class | what twhttp said |")
    print("|---|---|---|---|---|")
    for number, row in enumerate(ROWS):
        result = subprocess.run(
            command("twhttp", *row[2], each.url(number)),
            capture_output=True,
            encoding="utf-8",
            errors="replace",
            env=plain_environment(),
        )
        kind, text = said(result.stderr)
        text = (text or "-").replace("|", "\\|").replace("127.0.0.1", "camera")
        words = [row[0], row[2][0], str(result.returncode), kind or "done", text]
        print("| " + " | ".join(words) + " |")
    distrust()
    each.close()


if __name__ == "__main__":
    sys.dont_write_bytecode = True
    print_table()
