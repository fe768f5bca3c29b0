"""Wrong usage ends with 2, says what is wrong, and sends nothing."""

import re

import pytest

from twhttp_fixtures import peer  # noqa: F401 (fixture)
from twhttp_server import response

pytestmark = pytest.mark.native

URL = "http://camera.invalid/"


def refused(result, *phrases):
    assert result.returncode == 2, result.stderr
    assert result.stdout == ""
    assert result.stderr.startswith("twhttp: ")
    assert "--help" in result.stderr
    for phrase in phrases:
        assert phrase in result.stderr


@pytest.mark.parametrize(
    "words, phrase",
    [
        ([], "A subcommand is required"),
        (["fetch", URL], "fetch"),
        (["get"], "target is required"),
        (["get", URL, "second"], "second"),
        (["get", "--no-such-option", URL], "--no-such-option"),
        (["get", "ftp://camera/"], 'the scheme "ftp" is neither http nor https'),
        (["get", "http:///path"], "the target has no host"),
        (["get", "http://camera:port/"], '"port" is no port'),
        (["get", "http://camera:65536/"], '"65536" is no port'),
        (["get", "http://[::1]/"], "by IPv4 alone"),
        (["xml-get", "https://camera/"], "xml-get never uses TLS"),
        (["json-get", "https://camera/"], "json-gets does"),
        (["json-gets", URL], "json-gets always uses TLS"),
        (["form", URL], "--data or --data-file is needed"),
        (["form", "-d", "a", "-f", "b", URL], "excludes"),
        (["get", "--timeout", "soon", URL], "--timeout"),
        (["get", "--timeout"], "--timeout"),
        (["get", "--source", "camera", URL], '"camera" is no dotted IPv4 address'),
        (["get", "--http", "2", URL], '"2" is none of default, 1.0 and 1.1'),
        (["get", "--max-body", "-1", URL], "--max-body"),
        (["get", "--max-body", "much", URL], "--max-body"),
        (["get", "--repeat", "0", URL], "--repeat"),
        (["get", "--repeat", "often", URL], "--repeat"),
        (["get", "--interval", "a while", URL], '"a while" is no span'),
        (["get", "--give-up", "5 parsecs", URL], '"5 parsecs" is no span'),
        (["get", "--challenge", "Basic", URL], "--offline"),
        (["get", "--as-curl", "--offline", URL], "excludes"),
        (["get", "--record"], "--record"),
        (["get", "--cookie"], "--cookie"),
        (["get", "--keep"], "--keep"),
        (["curl-form", "--separators"], "--separators"),
        (["curl-get", "--response-file"], "--response-file"),
        (["get", "--password-file", "/nonexistent", URL], "/nonexistent: no password in it"),
        (["--completion", "tcsh"], "--completion"),
    ],
)
def test_what_is_wrong_is_named(run, words, phrase):
    refused(run("twhttp", *words), phrase)


@pytest.mark.parametrize(
    "words",
    [
        ["soap", "--cookie", "a=b", "-d", "x"],
        ["soap", "--http", "1.1", "-d", "x"],
        ["json-get", "--direct"],
        ["json-post", "--encode-query", "-d", "x"],
        ["xml-put", "--timeout", "5", "-d", "<a/>"],
        ["get", "--insecure"],
        ["get", "-d", "body"],
        ["form", "--basic-first", "-d", "x"],
        ["upload", "--response-file", "a", "-d", "x"],
        ["curl-get", "--max-body", "5"],
    ],
)
def test_an_option_that_the_operation_has_no_use_for_is_refused(run, words):
    refused(run("twhttp", *words, URL))


def test_a_document_that_is_no_xml_is_not_sent(run, peer):
    server = peer(response(b"x"))
    result = run("twhttp", "xml-post", "-d", "<preset>", server.url())
    assert (result.returncode, server.connections) == (3, 0)
    assert "no well-formed XML" in result.stderr


def test_help_is_on_standard_output(run):
    result = run("twhttp", "--help")
    assert (result.returncode, result.stderr) == (0, "")
    for operation in ("get", "soap-auth", "json-gets", "raw-resp", "codes"):
        assert f"  {operation} " in result.stdout


@pytest.mark.parametrize("operation", ["get", "form", "upload", "curl-form", "xml-put"])
def test_each_option_has_its_sentence(run, operation):
    text = run("twhttp", operation, "--help").stdout
    options = text.partition("Options:\n")[2].partition("\nThe library's call")[0]
    entries = [" ".join(entry.split()) for entry in re.split(r"\n  (?=-)", options)]
    assert len(entries) > 10
    for entry in entries[1:]:  # the first is --help
        assert re.search(r"[A-Z][a-z].*[.)]$", entry), entry


def test_completion_knows_the_operations_and_their_options(run):
    assert run("twhttp", "__complete", "soap-a").stdout.startswith("soap-auth\t")
    assert run("twhttp", "__complete", "get", "--give").stdout.startswith("--give-up\t")
    assert run("twhttp", "__complete", "get", "--http", "1.").stdout == "1.0\n1.1\n"
