"""Every style of authentication, with right and wrong credentials, and what the camera says."""

import base64
import http.client
import re
import urllib.error
import urllib.request

import pytest

from conftest import HANG
from twcamsim_support import (
    body_of,
    camera,
    challenge_words,
    digest_line,
    headers_of,
    request_with,
    status_of,
)

pytestmark = pytest.mark.native

ASK = request_with("X-None: 1")
PLAIN_DIGESTS = [
    "digest",
    "digest-no-qop",
    "digest-qop-list",
    "digest-qop-list-auth-first",
    "digest-auth-int",
    "digest-opaque",
    "digest-algorithm",
    "digest-algorithm-quoted",
    "digest-md5-sess",
    "digest-odd-order",
    "digest-unquoted",
    "digest-strict",
    "digest-strict-algorithm",
]


def qop_of(words):
    return words["qop"].split(",")[0] if "qop" in words else ""


def challenge_of(running):
    """The first Digest challenge for a request without credentials."""
    seen = running.ask(ASK)
    assert status_of(seen.bytes) == 401
    return next(line for line in headers_of(seen.bytes, "WWW-Authenticate") if "igest" in line)


def authenticate(running, words, qop=None, **changes):
    """Sends credentials for a challenge."""
    qop = qop_of(words) if qop is None else qop
    line = digest_line(words, qop, **changes)
    return running.ask(
        request_with(line, changes.get("target", "/info.cgi"), changes.get("send", "GET"))
    )


def refusal(seen):
    """The field that a 401 says was wrong."""
    assert status_of(seen.bytes) == 401
    return body_of(seen.bytes).decode().split(": ")[1]


def test_no_credentials_are_asked_for_without_a_style(camera):
    running = camera("-e", "cgi")
    assert status_of(running.ask(ASK).bytes) == 200
    assert running.journal()[0]["requests"][0]["login"] == {"passed": True, "scheme": "none"}


def basic(text):
    return "Authorization: Basic " + base64.b64encode(text.encode()).decode()


@pytest.mark.parametrize(
    "line, status, field",
    [
        (basic("operator:gate-7"), 200, None),
        (basic("operator:gate-8"), 401, "password"),
        (basic("guest:gate-7"), 401, "user"),
        (basic(":"), 401, "user"),
        (basic("operator"), 401, "encoding"),
        ("Authorization: Basic ???", 401, "encoding"),
        ("Authorization: Bearer x", 401, "scheme"),
        ("Authorization: Digest x=1", 401, "scheme"),
        ("X-None: 1", 401, "missing"),
    ],
)
def test_basic_names_the_wrong_part(camera, line, status, field):
    running = camera("-e", "cgi-basic")
    seen = running.ask(request_with(line))
    assert status_of(seen.bytes) == status
    verdict = running.journal()[0]["requests"][0]["login"]
    assert (verdict["passed"], verdict.get("field")) == (status == 200, field)
    if field:
        assert refusal(seen) == field
        assert headers_of(seen.bytes, "WWW-Authenticate") == ['Basic realm="camera"']


@pytest.mark.parametrize("style", PLAIN_DIGESTS)
def test_the_right_credentials_pass(camera, style):
    running = camera("-e", f"cgi,login={style}")
    words = challenge_words(challenge_of(running))
    seen = authenticate(running, words)
    assert (status_of(seen.bytes), body_of(seen.bytes)[:7]) == (200, b"camera=")
    assert running.journal(2)[1]["requests"][0]["login"]["user"] == "operator"


@pytest.mark.parametrize("style", PLAIN_DIGESTS)
def test_a_wrong_password_is_a_wrong_response(camera, style):
    running = camera("-e", f"cgi,login={style}")
    words = challenge_words(challenge_of(running))
    assert refusal(authenticate(running, words, password="gate-8")) == "response"


@pytest.mark.parametrize(
    "style, pattern",
    [
        ("digest", r'Digest realm="camera", qop="auth", nonce="[0-9a-f]{24}"'),
        ("digest-no-qop", r'Digest realm="camera", nonce="[0-9a-f]{24}"'),
        ("digest-qop-list", r'Digest realm="camera", qop="auth-int,auth", nonce="\w+"'),
        ("digest-qop-list-auth-first", r'Digest realm="camera", qop="auth,auth-int", nonce="\w+"'),
        ("digest-opaque", r'Digest realm="camera", qop="auth", nonce="\w+", opaque="\w+"'),
        ("digest-algorithm", r'Digest .*, algorithm=MD5'),
        ("digest-algorithm-quoted", r'Digest .*, algorithm="MD5"'),
        ("digest-md5-sess", r'Digest .*, algorithm=MD5-sess'),
        (
            "digest-odd-order",
            r'Digest domain="/" , stale="false" , algorithm=MD5 , opaque="\w+" , nonce="\w+" , '
            r'qop="auth" , realm="camera"',
        ),
        ("digest-unquoted", r'Digest realm=camera, qop="auth", nonce=[0-9a-f]{24}'),
        ("digest-and-basic", r'Digest realm="camera", .*, Basic realm="camera"'),
    ],
)
def test_a_challenge_looks_as_its_style_says(camera, style, pattern):
    assert re.fullmatch(pattern, challenge_of(camera("-e", f"cgi,login={style}")))


@pytest.mark.parametrize(
    "style, schemes",
    [("digest-or-basic", ["Digest", "Basic"]), ("basic-or-digest", ["Basic", "Digest"])],
)
def test_both_schemes_have_a_line_each(camera, style, schemes):
    running = camera("-e", f"cgi,login={style}")
    lines = headers_of(running.ask(ASK).bytes, "WWW-Authenticate")
    assert [line.split()[0] for line in lines] == schemes
    assert status_of(running.ask(request_with(basic("operator:gate-7"))).bytes) == 200
    assert status_of(authenticate(running, challenge_words(challenge_of(running))).bytes) == 200


@pytest.mark.parametrize(
    "changes, field, phrase",
    [
        ({"user": "guest"}, "user", 'the user is "guest", not "operator"'),
        ({"uri": "/other.cgi"}, "uri", 'the uri is "/other.cgi", not "/info.cgi"'),
        ({"nc": "1"}, "nc", "8 hexadecimal digits"),
        ({"cnonce": ""}, "cnonce", "cnonce is not"),
        ({"qop": "auth-int"}, "qop", 'the qop is "auth-int", not "auth"'),
        ({"response": "0" * 32}, "response", "another password"),
        ({"method": "POST"}, "response", "computed for the method POST"),
        ({"password": ""}, "response", "computed for an empty password"),
    ],
)
def test_the_wrong_field_is_named(camera, changes, field, phrase):
    running = camera("-e", "cgi-digest")
    seen = authenticate(running, challenge_words(challenge_of(running)), **changes)
    assert refusal(seen) == field and phrase in body_of(seen.bytes).decode()
    verdict = running.journal(2)[1]["requests"][0]["login"]
    assert (verdict["field"], phrase in verdict["text"]) == (field, True)


@pytest.mark.parametrize(
    "name, value, field",
    [
        ("realm", "garden", "realm"),
        ("nonce", "5f3d9c", "nonce"),
        ("opaque", "other", "opaque"),
        ("algorithm", "SHA-256", "algorithm"),
    ],
)
def test_a_word_of_the_challenge_must_come_back(camera, name, value, field):
    running = camera("-e", "cgi,login=digest-odd-order")
    words = challenge_words(challenge_of(running))
    assert refusal(authenticate(running, {**words, name: value})) == field


def test_a_response_without_the_qop_that_it_names_is_explained(camera):
    running = camera("-e", "cgi-digest")
    words = challenge_words(challenge_of(running))
    plain = digest_line(words, "").partition('response="')[2].partition('"')[0]
    seen = authenticate(running, words, response=plain)
    assert "computed without qop" in body_of(seen.bytes).decode()


def test_a_count_without_qop_means_nothing(camera):
    running = camera("-e", "cgi,login=digest-no-qop")
    line = digest_line(challenge_words(challenge_of(running)), "") + ", nc=many"
    assert status_of(running.ask(request_with(line)).bytes) == 200


def test_auth_int_takes_the_body_into_account(camera):
    running = camera("-e", "cgi,login=digest-auth-int")
    words = challenge_words(challenge_of(running))
    line = digest_line(words, "auth-int", method="POST", uri="/text.cgi", body="pan=3")
    sent = request_with(line, "/text.cgi", "POST", "pan=3")
    assert status_of(running.ask(sent).bytes) == 200
    words = challenge_words(challenge_of(running))
    line = digest_line(words, "auth-int", method="POST", uri="/text.cgi", body="")
    seen = running.ask(request_with(line, "/text.cgi", "POST", "pan=3"))
    assert "computed for an empty body" in body_of(seen.bytes).decode()


def test_a_nonce_takes_a_count_once(camera):
    running = camera("-e", "cgi-digest")
    words = challenge_words(challenge_of(running))
    assert status_of(authenticate(running, words).bytes) == 200
    again = authenticate(running, words)
    assert refusal(again) == "nc"
    assert "stale=true" in headers_of(again.bytes, "WWW-Authenticate")[0]
    assert status_of(authenticate(running, words, nc="00000002").bytes) == 200


def test_a_stale_nonce_is_said_to_be_stale_and_the_next_one_passes(camera):
    running = camera("-e", "cgi,login=digest-stale")
    seen = authenticate(running, challenge_words(challenge_of(running)))
    assert refusal(seen) == "nonce"
    challenge = headers_of(seen.bytes, "WWW-Authenticate")[0]
    assert challenge.endswith("stale=true")
    assert status_of(authenticate(running, challenge_words(challenge)).bytes) == 200


def test_a_wrong_password_is_never_stale(camera):
    running = camera("-e", "cgi,login=digest-stale")
    seen = authenticate(running, challenge_words(challenge_of(running)), password="x")
    assert refusal(seen) == "response"
    assert "stale" not in headers_of(seen.bytes, "WWW-Authenticate")[0]


@pytest.mark.parametrize(
    "style, old, new, field",
    [
        ("digest-strict", "qop=auth", 'qop="auth"', "qop"),
        ("digest-strict", "nc=00000001", 'nc="00000001"', "nc"),
        ("digest-strict", 'username="operator"', "username=operator", "username"),
        ("digest-strict-algorithm", "algorithm=MD5", 'algorithm="MD5"', "algorithm"),
    ],
)
def test_a_strict_camera_refuses_wrong_quotes_and_a_usual_one_does_not(
    camera, style, old, new, field
):
    for endpoint, status in ((style, 401), ("digest-algorithm", 200)):
        running = camera("-e", f"cgi,login={endpoint}")
        line = digest_line(challenge_words(challenge_of(running)))
        seen = running.ask(request_with(line.replace(old, new)))
        assert status_of(seen.bytes) == status
        if status == 401:
            assert refusal(seen) == "quotes" and f'"{field}"' in body_of(seen.bytes).decode()


def test_what_is_no_list_of_words_is_told(camera):
    running = camera("-e", "cgi-digest")
    for text in ("Digest nonsense", 'Digest realm="open'):
        assert refusal(running.ask(request_with(f"Authorization: {text}"))) == "quotes"


# This client knows neither auth-int nor MD5-sess.
@pytest.mark.parametrize(
    "style",
    sorted(set(PLAIN_DIGESTS) - {"digest-auth-int", "digest-qop-list", "digest-md5-sess"}),
)
def test_another_client_logs_in_as_well(camera, style):
    running = camera("-e", f"cgi,login={style}")
    passwords = urllib.request.HTTPPasswordMgrWithDefaultRealm()
    passwords.add_password(None, running.url("/"), "operator", "gate-7")
    opener = urllib.request.build_opener(urllib.request.HTTPDigestAuthHandler(passwords))
    if style.startswith("digest-strict"):
        # This client names the algorithm in quotes, and gives up when it is refused again.
        with pytest.raises(urllib.error.HTTPError):
            opener.open(running.url("/info.cgi"), timeout=HANG)
        return
    assert opener.open(running.url("/info.cgi"), timeout=HANG).status == 200


def test_the_account_is_an_option(camera):
    running = camera("-e", "cgi-digest,user=guest,password=pw,realm=garden")
    challenge = challenge_of(running)
    assert 'realm="garden"' in challenge
    seen = authenticate(running, challenge_words(challenge), user="guest", password="pw")
    assert status_of(seen.bytes) == 200


def test_credentials_work_over_one_connection(camera):
    running = camera("-e", "cgi-digest")
    client = http.client.HTTPConnection("127.0.0.1", running.port(), timeout=HANG)
    client.request("GET", "/info.cgi")
    refused = client.getresponse()
    words = challenge_words(refused.headers["WWW-Authenticate"])
    refused.read()
    line = digest_line(words).partition(": ")[2]
    client.request("GET", "/info.cgi", headers={"Authorization": line})
    assert client.getresponse().status == 200
    client.close()
    assert [entry["status"] for entry in running.journal()[0]["requests"]] == ["401", "200"]


def challenged(camera, fault, endpoint="cgi-digest"):
    running = camera("-e", endpoint, "-f", fault)
    return running, headers_of(running.ask(ASK).bytes, "WWW-Authenticate")


def test_fault_endless_401_refuses_the_right_credentials(camera):
    running, lines = challenged(camera, "endless-401")
    seen = authenticate(running, challenge_words(lines[0]))
    assert refusal(seen) == "never" and "right" in body_of(seen.bytes).decode()


def test_fault_endless_401_asks_for_credentials_where_there_was_no_need(camera):
    assert challenged(camera, "endless-401", "json")[1][0].startswith("Digest ")


def test_fault_nonce_changing_finds_each_nonce_replaced(camera):
    running, lines = challenged(camera, "nonce-changing")
    seen = authenticate(running, challenge_words(lines[0]))
    assert refusal(seen) == "nonce"
    assert "stale" not in headers_of(seen.bytes, "WWW-Authenticate")[0]


def test_fault_stale_never_ends(camera):
    running, lines = challenged(camera, "stale")
    for _ in range(3):
        seen = authenticate(running, challenge_words(lines[0]))
        assert refusal(seen) == "nonce"
        lines = headers_of(seen.bytes, "WWW-Authenticate")
        assert "stale=true" in lines[0]


@pytest.mark.parametrize(
    "fault, endpoint, expected",
    [
        ("no-realm", "cgi-basic", ["Basic"]),
        ("no-realm", "cgi-digest", [r'Digest qop="auth", nonce="\w+"']),
        ("no-nonce", "cgi-digest", ['Digest realm="camera", qop="auth"']),
        ("no-challenge", "cgi-digest", []),
        ("other-scheme", "cgi-basic", ['Bearer realm="camera"']),
        ("other-scheme=Negotiate", "cgi-basic", ['Negotiate realm="camera"']),
        ("other-qop", "cgi-digest", [r'Digest realm="camera", qop="auth-conf", nonce="\w+"']),
        ("other-algorithm", "cgi-digest", [r"Digest .*, algorithm=SHA-256"]),
    ],
)
def test_fault_of_the_challenge(camera, fault, endpoint, expected):
    _, lines = challenged(camera, fault, endpoint)
    assert len(lines) == len(expected)
    for line, pattern in zip(lines, expected):
        assert re.fullmatch(pattern, line)


def test_fault_forbidden_follows_right_credentials(camera):
    running, lines = challenged(camera, "forbidden")
    assert status_of(authenticate(running, challenge_words(lines[0])).bytes) == 403
