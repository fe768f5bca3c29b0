// Status lines and header lines of the grammar.
#include "tests/attack/response.h"

namespace {

using namespace std::string_literals;

const std::string kStatusLines[] = {
    "ICY 200 OK",
    "HTTP/0.9 200 OK",
    "",
    "PRI * HTTP/2.0\r\n\r\nSM\r\n\r\n",
    "HTTP/2 200",
    "HTTP/1.1",
    "HTTP/1.1 ",
    "HTTP/1.1 OK",
    "HTTP/1.1 99999999999999999999 Large",
    "HTTP/1.1 -200 OK",
    "http/1.1 200 OK",
    "HTTP/1.1\t200\tOK",
    "HTTP/1.12 200 OK",
    "HTTP/1.1 0200 OK",
    "HTTP/1.1 2e2 OK",
    "HTTP/1.1 4294967496 OK",
    "HTTP/1.1   200   OK",
    " HTTP/1.1 200 OK",
    "\r\nHTTP/1.1 200 OK",
    "RTSP/1.0 200 OK",
    "SSH-2.0-server",
    "HTTP/1.1 200 \x1b[2J\x1b]0;title\x07",
    "HTTP/1.1 20\0"s + "0 OK",
    "HTTP/1.1\0 200 OK"s,
    "HTTP/1.1 401\0 Unauthorized"s,
    "HTTP/1.1 200 OK\rX: y",
    "{\"success\":true}",
    "<html>",
    "HTTP/1.1 000 Zero",
    "HTTP/1.1 999 Nine",
    "HTTP/1.1 %s%n%s%n 200",
    "\xef\xbb\xbfHTTP/1.1 200 OK",
};

const std::string kHeaderLines[] = {
    "Content-Length: -1",
    "Content-Length: 99999999999999999999999",
    "Content-Length: 0x10",
    "Content-Length: 5, 5",
    "Content-Length: 5, 6",
    "Content-Length: 12abc",
    "Content-Length: +5",
    "Content-Length:",
    "Content-Length: ",
    "Content-Length: 0",
    "Content-Length: 2147483646",
    "Content-Length: 2147483647",
    "Content-Length: 2147483648",
    "Content-Length: 4294967296",
    "Content-Length: 18446744073709551615",
    "Content-Length: 7\r\nContent-Length: 8",
    "content-length:9",
    "Content-Length : 5",
    "Content-Length\t: 5",
    "Content-Length; 5",
    "Content-Length=5",
    "Transfer-Encoding: chunked",
    "Transfer-Encoding: Chunked",
    "Transfer-Encoding: gzip, chunked",
    "Transfer-Encoding: chunked, chunked",
    "Transfer-Encoding: chunked, identity",
    "Transfer-Encoding: identity",
    "Transfer-Encoding: chunked;q=1",
    "Transfer-Encoding:\tchunked",
    "Transfer-Encoding: xchunked",
    "Transfer-Encoding: \"chunked\"",
    "Transfer-Encoding:",
    "Transfer-Encoding: chunked\r\nTransfer-Encoding: identity",
    "Transfer-Encoding: chunked\r\nContent-Length: 3",
    "Transfer-Encoding : chunked",
    "Transfer-Encoding:\x0b chunked",
    "Content-Encoding: gzip",
    "Content-Encoding: deflate, gzip, br, zstd, deflate, gzip, br",
    "Content-Range: bytes 0-9/5",
    "Content-Range: bytes -9223372036854775809-/*",
    "Content-Type: application/json\x1b[31m",
    "Content-Type:",
    "Content-Type: text/html; charset=\"",
    "Connection: close",
    "Connection: keep-alive",
    "Connection: upgrade\r\nUpgrade: h2c",
    "Keep-Alive: timeout=0, max=-1",
    "Set-Cookie: a=b; path=/; expires=Thu, 01 Jan 1970 00:00:00 GMT",
    "Set-Cookie: ",
    "Set-Cookie:",
    "Set-Cookie: a=\x1b[2J\x7f\xff;",
    "Set-Cookie: a=b\0c;"s,
    "Set-Cookie: a=b\rX-Split: yes;",
    "Set-Cookie: a=b\r\rX-Split: yes; c",
    "Set-Cookie: a=b%0d%0aX-Split: yes;",
    "Set-Cookie: no semicolon",
    "Set-Cookie: ;",
    "Location: http://127.0.0.1:1/",
    "Location: file:///etc/passwd",
    "Location: \x1b\x1b",
    "Alt-Svc: h3=\":1\"; ma=1",
    "Strict-Transport-Security: max-age=1",
    "Trailer: Content-Length",
    "X: a\r\n folded",
    "X: a\r\n\tfolded\r\n\tagain",
    "X: \0"s,
    "X\0: y"s,
    "X: \r",
    "X: a\rb",
    "X: a\nY: b",
    "X: \x1b]0;title\x07",
    ": without a name",
    "::::",
    " ;=:",
    "without a colon",
    "X",
    "\xff\xfe\xfd: \x80\x81",
    "X: \xe2\x80\xae turned",
    "X: %n%n%s%s",
    "HTTP/1.1 200 OK",
    "GET / HTTP/1.1",
    "\t",
    " ",
};

const std::string kChallenges[] = {
    "Basic realm=\"camera\"",
    "Basic",
    "basic realm=camera",
    "Digest realm=\"camera\", nonce=\"5f3d9c\"",
    "Digest realm=\"a, b\", nonce=\"c, d\", qop=\"auth,auth-int\"",
    "Digest realm=\"camera\", nonce=\"x\", qop=\"auth\", stale=true",
    "Digest realm=\"camera\", nonce=\"x\", stale=TRUE, algorithm=MD5-sess",
    "Digest realm=\"camera\", nonce=\"x\", qop=auth-int, algorithm=SHA-256",
    "Digest realm=\"camera, nonce=\"x, qop=\"auth",
    "Digest realm=camera\", nonce=x\"\"",
    "Digest realm=\"a\\\"b\\\\\", nonce=\"c\\\"d\", opaque=\"\\\"",
    "Digest nonce=\"x\", nonce=\"y\", nonce=\"z\", realm=",
    "Digest =,=,=,",
    "Digest",
    "Digest realm=\"\x1b[2J\", nonce=\"\x01\x02\x7f\"",
    "Digest realm=\"\0\", nonce=\"a\0b\""s,
    "Digest realm=\"r\rX-Split: yes\", nonce=\"n\rX-Split: yes\"",
    "Digest realm=\"r\r\rX-Split: yes\", nonce=\"n\r\rX-Split: yes\"",
    "Digest realm=\"r\\r\\nX-Split: yes\", nonce=\"n\"",
    "Digest realm=\"r%0d%0aX-Split: yes\", nonce=\"n\", qop=\"auth\"",
    "Digest realm=\"r\", nonce=\"n\", qop=\"auth, X-Split: yes\"",
    "Digest realm=\"r\", domain=\"nonce=opaque\", noncerealm=\"q\", qop=qop",
    "Digest realm=\"r\", nonce=\"n\", algorithm=MD5\", opaque=\"o",
    "Negotiate",
    "NTLM TlRMTVNTUAACAAAA",
    "NTLM \xff\xff",
    "Negotiate YIIB/////",
    "Bearer realm=\"x\"",
    "Basic realm=\"a\", Digest realm=\"b\", nonce=\"c\"",
    "Digest realm=\"b\", nonce=\"c\"\r\nWWW-Authenticate: Basic realm=\"a\"",
    "\x80\xff",
    "%s%s%n",
};

}  // namespace

std::string HostileStatusLine(Dice* dice) {
  if (dice->OneIn(40)) return "HTTP/1.1 200 " + std::string(dice->Between(1000, 80000), 'x');
  if (dice->OneIn(40)) return std::string(dice->Between(1000, 80000), 'H');
  if (dice->OneIn(20)) return dice->Bytes(dice->Below(100));
  return dice->Pick(kStatusLines);
}

std::string CleanChallenge(Dice* dice) {
  if (dice->OneIn(2)) return "Basic realm=\"" + dice->Letters(6) + "\"";
  const std::string qop = dice->OneIn(2) ? ", qop=\"auth\"" : "";
  return "Digest realm=\"" + dice->Letters(6) + "\", nonce=\"" + dice->Letters(12) + "\"" + qop;
}

std::string HostileChallenge(Dice* dice) {
  if (dice->OneIn(12)) {
    const std::string nonce(dice->Between(500, 70000), 'n');
    return "Digest realm=\"r\", nonce=\"" + nonce + "\", qop=\"auth\"";
  }
  if (dice->OneIn(20)) return "Digest realm=\"" + dice->Bytes(30) + "\", nonce=\"n\"";
  if (dice->OneIn(20)) return dice->Bytes(dice->Below(60));
  return dice->Pick(kChallenges);
}

std::string HostileHeaderLine(Dice* dice) {
  if (dice->OneIn(5)) return "WWW-Authenticate: " + HostileChallenge(dice);
  if (dice->OneIn(60)) return "X: " + std::string(dice->Between(2000, 70000), 'x');
  if (dice->OneIn(60)) return "Set-Cookie: " + std::string(dice->Between(2000, 70000), 'c') + ";";
  if (dice->OneIn(20)) return dice->Letters(5) + ": " + dice->Bytes(dice->Below(60));
  if (dice->OneIn(30)) return "Set-Cookie: " + dice->Bytes(dice->Below(60)) + ";";
  return dice->Pick(kHeaderLines);
}
