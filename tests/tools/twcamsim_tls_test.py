"""The simulated camera over TLS, with a good certificate and with all that can be wrong there."""

import socket
import ssl

import pytest

from conftest import HANG
from twcamsim_support import body_of, camera, read_all, status_of

pytestmark = pytest.mark.native

TLS = "json,tls"


def handshake(running, context=None, name=None):
    with running.connect(name) as raw:
        context = context or running.tls_context()
        with context.wrap_socket(raw, server_hostname="127.0.0.1") as client:
            return client.version(), client.getpeercert()


def test_the_printed_authority_vouches_for_the_camera(camera):
    running = camera("-e", TLS)
    version, certificate = handshake(running)
    assert version == "TLSv1.3"
    assert certificate["subjectAltName"] == (("IP Address", "127.0.0.1"), ("DNS", "localhost"))
    seen = running.ask_tls()
    assert (status_of(seen.bytes), seen.end) == (200, "close")
    assert running.journal(2)[1]["tls"] == "TLSv1.3"


def test_nobody_else_vouches_for_it(camera):
    with pytest.raises(ssl.SSLCertVerificationError, match="unable to get local issuer"):
        handshake(camera("-e", TLS), ssl.create_default_context())


@pytest.mark.parametrize(
    "fault, reason",
    [
        ("cert-expired", "certificate has expired"),
        ("cert-not-yet", "certificate is not yet valid"),
        ("cert-foreign", "unable to get local issuer certificate"),
        ("cert-wrong-name", "IP address mismatch"),
        ("cert-self-signed", "self-signed certificate"),
    ],
)
def test_fault_of_the_certificate(camera, fault, reason):
    running = camera("-e", TLS, "-f", fault)
    with pytest.raises(ssl.SSLCertVerificationError, match=reason):
        handshake(running)
    assert running.journal()[0]["end"] == "tls-failed"


def test_a_client_that_does_not_look_gets_in_all_the_same(camera):
    running = camera("-e", TLS, "-f", "cert-expired")
    context = ssl.create_default_context()
    context.check_hostname = False
    context.verify_mode = ssl.CERT_NONE
    assert handshake(running, context)[0] == "TLSv1.3"


@pytest.mark.parametrize(
    "fault, error, reason",
    [
        ("tls-garbage", ssl.SSLError, "PACKET_LENGTH_TOO_LONG|WRONG_VERSION_NUMBER"),
        ("tls-plain", ssl.SSLError, "WRONG_VERSION_NUMBER"),
        ("tls-close", ssl.SSLError, "(?i)eof"),
        ("tls-cut", ssl.SSLError, "(?i)eof"),
        ("tls-reset", ConnectionResetError, "reset"),
        ("tls-alert", ssl.SSLError, "SSLV3_ALERT_HANDSHAKE_FAILURE"),
        ("tls-alert=80", ssl.SSLError, "TLSV1_ALERT_INTERNAL_ERROR"),
        ("tls-old", ssl.SSLError, "legacy sigalg disallowed|PROTOCOL_VERSION|UNSUPPORTED"),
    ],
)
def test_fault_of_the_handshake(camera, fault, error, reason):
    with pytest.raises(error, match=reason):
        handshake(camera("-e", TLS, "-f", fault))


def test_fault_tls_plain_serves_http_there(camera):
    seen = camera("-e", TLS, "-f", "tls-plain").ask(b"GET /info.json HTTP/1.0\r\n\r\n")
    assert status_of(seen.bytes) == 200


def test_fault_tls_old_speaks_to_an_old_client(camera):
    context = ssl.SSLContext(ssl.PROTOCOL_TLS_CLIENT)
    context.check_hostname = False
    context.verify_mode = ssl.CERT_NONE
    context.set_ciphers("DEFAULT:@SECLEVEL=0")
    with pytest.warns(DeprecationWarning):
        context.minimum_version = ssl.TLSVersion.TLSv1
    assert handshake(camera("-e", TLS, "-f", "tls-old"), context)[0] == "TLSv1.1"


def test_fault_tls_stall_takes_tcp_and_says_nothing(camera):
    running = camera("-e", TLS, "-f", "tls-stall")
    with running.connect() as raw:
        raw.settimeout(1)
        with pytest.raises(TimeoutError):
            running.tls_context().wrap_socket(raw, server_hostname="127.0.0.1")


def test_fault_no_close_notice_closes_without_one(camera):
    whole = camera("-e", TLS).ask_tls()
    assert (status_of(whole.bytes), whole.end) == (200, "close")
    assert camera("-e", TLS, "-f", "no-close-notice").ask_tls() == (whole.bytes, "cut")


def test_other_faults_work_through_tls(camera):
    running = camera("-e", TLS, "-f", "slow=9,1", "-f", "success-false")
    assert body_of(running.ask_tls().bytes).startswith(b'{"success":false')
    cut = camera("-e", TLS, "-f", "reset-at=20").ask_tls()
    assert cut == (b"HTTP/1.1 200 OK\r\nCon", "reset")


def test_plain_http_on_the_port_of_tls_is_noted(camera):
    running = camera("-e", TLS)
    running.ask()
    entry = running.journal()[0]
    assert (entry["end"], entry["requests"]) == ("tls-failed", []) and entry["error"]


def test_a_client_that_leaves_during_the_handshake_is_noted(camera):
    running = camera("-e", TLS)
    with running.connect() as client:
        client.shutdown(socket.SHUT_WR)
        read_all(client, HANG)
    assert running.journal()[0]["end"] == "tls-broken"


def test_a_fault_of_tls_does_nothing_to_a_plain_endpoint(camera):
    running = camera("-e", "json", "-e", TLS, "-f", "tls-garbage")
    assert status_of(running.ask(name="json").bytes) == 200
    assert running.journal()[0]["faults"] == []


def test_the_certificate_names_each_address_of_an_endpoint(camera):
    running = camera("-e", "json,tls,host=127.0.0.7", "-e", "cgi,tls")
    names = handshake(running, name="cgi-tls")[1]["subjectAltName"]
    assert ("IP Address", "127.0.0.7") in names and ("IP Address", "127.0.0.1") in names
