// Servers whose login challenges are broken, huge or meant to break the next request.
#define OPENSSL_SUPPRESS_DEPRECATED
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/evp.h>
#include <openssl/md5.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tarnwick/utils/utils.h"
#include "tests/hostile/hostile_util.h"

namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr size_t kLongest = 64 << 10;
constexpr size_t kLineLimit = 2047;     // of a header line that the client reads
constexpr size_t kRequestLimit = 2047;  // of a GET that it sends
constexpr char kPath[] = "a.cgi";
constexpr char kSoapBody[] = "<q/>";

enum class Scheme { kNone, kBasic, kDigest };

// What the client has to understand of a challenge.
struct Login {
  Scheme scheme = Scheme::kNone;
  std::string realm = {};
  std::string nonce = {};
  std::string qop = {};
  std::string opaque = {};
  std::string algorithm = {};
};

Login Digest(const std::string& realm, const std::string& nonce, const std::string& qop = "",
             const std::string& opaque = "", const std::string& algorithm = "") {
  return {Scheme::kDigest, realm, nonce, qop, opaque, algorithm};
}

Login Basic() {
  return {Scheme::kBasic};
}

struct ChallengeCase {
  std::string name;
  std::string lines;                     // the header lines of the 401
  Login login;                           // of the request that follows; kNone: none follows
  int response = HTTP_RET_UNAUTHORIZED;  // what CheckResponse gives when none follows
  std::string cookie = {};               // that the request that follows carries
  std::string user = "user";
  std::string password = "pass";
};

std::ostream& operator<<(std::ostream& out, const ChallengeCase& test) {
  return out << test.name;
}

std::string Line(const std::string& challenge) {
  return "WWW-Authenticate: " + challenge + "\r\n";
}

// The login of the library, written down a second time.

std::string Hex(const unsigned char* digest) {
  static const char digits[] = "0123456789abcdef";
  std::string hex;
  for (int i = 0; i < MD5_DIGEST_LENGTH; ++i) {
    hex += digits[digest[i] >> 4];
    hex += digits[digest[i] & 15];
  }
  return hex;
}

std::string Md5(const std::string& text) {
  unsigned char digest[EVP_MAX_MD_SIZE];
  EXPECT_EQ(EVP_Digest(text.data(), text.size(), digest, nullptr, EVP_md5(), nullptr), 1);
  return Hex(digest);
}

// For "auth-int" a finished digest is fed its own hex and finished again.
std::string Ha2(const std::string& method, const std::string& qop) {
  const std::string start = method + ":/" + kPath;
  if (qop != "auth-int") return Md5(start);
  MD5_CTX context;
  unsigned char digest[MD5_DIGEST_LENGTH];
  MD5_Init(&context);
  MD5_Update(&context, start.data(), start.size());
  MD5_Final(digest, &context);
  const std::string more = ":" + Hex(digest);
  MD5_Update(&context, more.data(), more.size());
  MD5_Final(digest, &context);
  return Hex(digest);
}

std::string ResponseOf(const ChallengeCase& test, const std::string& method,
                       const std::string& cnonce) {
  const Login& login = test.login;
  const bool counted = login.qop == "auth" || login.qop == "auth-int";
  return Md5(Md5(test.user + ":" + login.realm + ":" + test.password) + ":" + login.nonce +
             (counted ? ":00000001:" + cnonce + ":" + login.qop : "") + ":" +
             Ha2(method, login.qop));
}

std::string DigestLine(const ChallengeCase& test, const std::string& method,
                       const std::string& cnonce) {
  const Login& login = test.login;
  std::string line = "Authorization: Digest username=\"" + test.user + "\", realm=\"" +
                     login.realm + "\", nonce=\"" + login.nonce + "\", uri=\"/" + kPath +
                     "\", response=\"" + ResponseOf(test, method, cnonce) + "\"";
  if (!login.qop.empty()) {
    line += ", qop=" + login.qop + ", nc=00000001, cnonce=\"" + cnonce + "\"";
  }
  if (!login.algorithm.empty()) line += ", algorithm=\"" + login.algorithm + "\"";
  if (!login.opaque.empty()) line += ", opaque=\"" + login.opaque + "\"";
  return line + "\r\n";
}

std::string BasicLine(const ChallengeCase& test) {
  const std::string pair = test.user + ":" + test.password;
  const std::string text = pair.c_str();  // up to its first zero byte
  std::string encoded((text.size() + 2) / 3 * 4, '\0');
  EVP_EncodeBlock(reinterpret_cast<unsigned char*>(encoded.data()),
                  reinterpret_cast<const unsigned char*>(text.data()),
                  static_cast<int>(text.size()));
  return "Authorization: Basic " + encoded + "\r\n";
}

// The client's nonce in a request; one of its length when the request was cut before it.
std::string ClientNonce(const std::string& request) {
  static const std::string mark = "cnonce=\"";
  const size_t found = request.find(mark);
  return found == std::string::npos ? std::string(32, '0')
                                    : request.substr(found + mark.size(), 32);
}

std::string LoginLine(const ChallengeCase& test, const std::string& method,
                      const std::string& request) {
  if (test.login.scheme == Scheme::kNone) return "";
  if (test.login.scheme == Scheme::kBasic) return BasicLine(test);
  return DigestLine(test, method, ClientNonce(request));
}

// The GET that follows; `sent` is what came, for the client's own nonce in it.
std::string ExpectedGet(const ChallengeCase& test, const std::string& sent) {
  const std::string cookie = test.cookie.empty() ? "" : "Cookie: " + test.cookie + "\r\n";
  const std::string request = std::string("GET /") + kPath +
                              " HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n" + cookie +
                              LoginLine(test, "GET", sent) + "\r\n";
  // A zero byte ends the text that is sent.
  return std::string(request.c_str()).substr(0, kRequestLimit);
}

std::string ExpectedPost(const ChallengeCase& test, const std::string& sent) {
  std::string request = std::string("POST /") + kPath +
                        " HTTP/1.1\r\nHost: 127.0.0.1\r\n"
                        "Content-Type: application/soap+xml; charset=utf-8\r\n" +
                        LoginLine(test, "POST", sent) + "Content-Length: 4\r\n\r\n" + kSoapBody;
  // The length stays, and zero bytes stand in for what a zero byte has ended.
  std::fill(std::find(request.begin(), request.end(), '\0'), request.end(), '\0');
  return request;
}

// Nothing that came from the server may end the head of a request, or a line of it.
void ExpectOneHead(const ChallengeCase& test, const std::string& request) {
  const std::string ends("\r\n\0", 3);
  const bool spoilt_by_daemon = test.user.find_first_of(ends) != std::string::npos;
  const bool cut = request.size() == kRequestLimit;
  if (spoilt_by_daemon || cut) return;
  const size_t end = request.find("\r\n\r\n");
  ASSERT_NE(end, std::string::npos);
  std::string head = request.substr(0, end);
  for (size_t i; (i = head.find("\r\n")) != std::string::npos;) head.erase(i, 2);
  EXPECT_THAT(head, Not(HasSubstr("\r")));
  EXPECT_THAT(head, Not(HasSubstr("\n")));
  EXPECT_THAT(head, Not(HasSubstr(std::string(1, '\0'))));
}

const char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\ndone";

std::string Refusal(const std::string& lines) {
  return "HTTP/1.1 401 Unauthorized\r\n" + lines + "\r\n";
}

// A request is refused with the challenge, and the one that follows, of a known length, is not.
std::vector<Script> RefuseOnce(const ChallengeCase& test, size_t next_length) {
  std::vector<Script> scripts = {Exchange(Refusal(test.lines))};
  if (test.login.scheme == Scheme::kNone) return scripts;
  scripts.push_back({ExpectBytes(next_length), Send(kOk), Close()});
  return scripts;
}

ClientSettings SettingsOf(const ChallengeCase& test) {
  ClientSettings settings;
  settings.path = kPath;
  settings.user = test.user;
  settings.password = test.password;
  return settings;
}

Outcome ExpectedOutcome(const ChallengeCase& test, int result, const std::string& text) {
  if (test.login.scheme != Scheme::kNone) return Success(text);
  return {result, test.response, 401, ""};
}

void PlayGet(const ChallengeCase& test) {
  const LogCapture log(5);
  ScriptedPeer peer(RefuseOnce(test, ExpectedGet(test, "").size()));
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] {
    ClientProbe client(peer.Port(), SettingsOf(test));
    const int result = client.SendRequest(HTTP_METHOD_GET, "");
    outcome = OutcomeOf(client, result);
    if (outcome.status == 200) outcome.text = ReadBody(client);
  });
  EXPECT_EQ(outcome, ExpectedOutcome(test, HTTP_RET_OK, "done"));
  EXPECT_THAT(HttpLog(log), IsEmpty());
  if (test.login.scheme == Scheme::kNone) return;
  const std::string sent = peer.Received(1);
  EXPECT_EQ(sent, ExpectedGet(test, sent));
  ExpectOneHead(test, sent);
}

void PlayPost(const ChallengeCase& test) {
  const LogCapture log(5);
  ScriptedPeer peer(RefuseOnce(test, ExpectedPost(test, "").size()));
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] {
    ClientProbe client(peer.Port(), SettingsOf(test));
    std::string reply;
    const int result = client.SendAuthReqBySocketPost(kSoapBody, reply);
    outcome = OutcomeOf(client, result, reply);
  });
  EXPECT_EQ(outcome, ExpectedOutcome(test, HTTP_RET_IO_ERROR, "done"));
  EXPECT_THAT(HttpLog(log), IsEmpty());
  if (test.login.scheme == Scheme::kNone) return;
  const std::string sent = peer.Received(1);
  EXPECT_EQ(sent, ExpectedPost(test, sent));
  ExpectOneHead(test, sent);
}

// The fields of a challenge, one of them at a time in each of these shapes.

const std::vector<std::string> kFields = {"realm",     "nonce", "qop",   "opaque",
                                          "algorithm", "stale", "domain"};

struct Shape {
  const char* name;
  std::string (*text)(const std::string& field);   // what stands in place of the field
  std::string (*value)(const std::string& field);  // what the client has to find
};

std::string Nothing(const std::string&) {
  return "";
}
std::string One(const std::string&) {
  return "1";
}

const Shape kShapes[] = {
    {"Missing", [](const std::string&) { return std::string("x=\"x\""); }, Nothing},
    {"Empty", [](const std::string& f) { return f + "="; }, Nothing},
    {"EmptyInQuotes", [](const std::string& f) { return f + "=\"\""; }, Nothing},
    {"Doubled", [](const std::string& f) { return f + "=\"1\", " + f + "=\"2\""; }, One},
    {"OfQuotes", [](const std::string& f) { return f + "=\"\"\"\"\"\"\"\""; }, Nothing},
    {"Unterminated", [](const std::string& f) { return f + "=\"1"; }, One},
    {"UnquotedInBlanks", [](const std::string& f) { return f + "  =   1   "; }, One},
    {"QuotesAroundAQuote", [](const std::string& f) { return f + "=\"1\"1\""; },
     [](const std::string&) { return std::string("1\"1"); }},
    {"OfEqualsSigns", [](const std::string& f) { return f + "====="; },
     [](const std::string&) { return std::string("===="); }},
    {"OfBlanks", [](const std::string& f) { return f + "=\"    \""; },
     [](const std::string&) { return std::string("    "); }},
};

void Store(Login* login, const std::string& field, const std::string& value) {
  if (field == "realm") login->realm = value;
  if (field == "nonce") login->nonce = value;
  if (field == "qop") login->qop = value;
  if (field == "opaque") login->opaque = value;
  if (field == "algorithm") login->algorithm = value;
}

std::string CaseName(const std::string& field, const std::string& shape) {
  std::string name = field + shape;
  name[0] = static_cast<char>(toupper(name[0]));
  return name;
}

// A sound challenge but for one field.
ChallengeCase FieldCase(const std::string& broken, const Shape& shape) {
  ChallengeCase test;
  test.name = CaseName(broken, shape.name);
  test.login.scheme = Scheme::kDigest;
  std::string challenge;
  for (const std::string& field : kFields) {
    const bool sound = field != broken;
    const std::string value = field == "qop" ? "auth" : field + "-value";
    challenge += (challenge.empty() ? "Digest " : ", ");
    challenge += sound ? field + "=\"" + value + "\"" : shape.text(field);
    Store(&test.login, field, sound ? value : shape.value(field));
  }
  test.lines = Line(challenge);
  return test;
}

// A field of 64 KB: the line is read up to its limit, and the fields behind are lost with the rest.
ChallengeCase LongFieldCase(const std::string& longest) {
  ChallengeCase test;
  test.name = CaseName(longest, "Of64KB");
  test.login.scheme = Scheme::kDigest;
  std::string line = "WWW-Authenticate: Digest ";
  for (const std::string& field : kFields) {
    line += field + "=\"";
    if (field == longest) break;
    const std::string value = field == "qop" ? "auth" : field + "-value";
    Store(&test.login, field, value);
    line += value + "\", ";
  }
  Store(&test.login, longest, std::string(kLineLimit - line.size(), 'A'));
  test.lines = line + std::string(kLongest, 'A') + "\", x=\"y\"\r\n";
  return test;
}

std::vector<ChallengeCase> FieldCases() {
  std::vector<ChallengeCase> cases;
  for (const std::string& field : kFields) {
    for (const Shape& shape : kShapes) cases.push_back(FieldCase(field, shape));
    cases.push_back(LongFieldCase(field));
  }
  return cases;
}

// Whole challenges.
const ChallengeCase kWhole[] = {
    {"NoChallenge", "", {}},
    {"AnEmptyLineOfTheHeadersName", "WWW-Authenticate:\r\n", {}, HTTP_RET_NOT_READY},
    {"OneBlank", "WWW-Authenticate: \r\n", {}},
    {"OnlyCommas", Line(",,,,,,,,"), {}},
    {"OnlyTheWordDigest", Line("Digest"), Digest("", "")},
    {"OnlyTheWordBasic", Line("Basic"), Basic()},
    {"WithoutABlankBehindTheColon", "WWW-Authenticate:Basic\r\n", Basic()},
    {"DigestInMixedCase", Line("dIgEsT realm=\"r\", nonce=\"n\""), Digest("r", "n")},
    {"NamesInCapitalsAreNotFound", Line("Digest REALM=\"r\", Nonce=\"n\""), Digest("", "")},
    {"NoCommas", Line("Digest realm=\"r\" nonce=\"n\" qop=\"auth\""),
     Digest("r\" nonce=\"n\" qop=\"auth", "n\" qop=\"auth", "auth")},
    {"NoEqualsSigns", Line("Digest realm nonce qop opaque algorithm"), Digest("", "")},
    {"ANameWithoutAnEqualsSignTakesTheNextValue", Line("Digest realm, nonce=\"n\""),
     Digest("n", "n")},
    {"ANameInsideAnotherValue", Line("Digest realm=\"nonce=x\", nonce=\"n\""),
     Digest("nonce=x", "x")},
    {"ANameInsideAnotherName", Line("Digest xrealm=\"x\", cnonce=\"c\", nonce=\"n\", realm=\"r\""),
     Digest("x", "c")},
    {"QuotedCommas", Line("Digest realm=\"a,b\", nonce=\"n,m\", qop=\"auth,auth-int\""),
     Digest("a", "n", "auth")},
    {"ListsOfQops", Line("Digest realm=\"r\", nonce=\"n\", qop=\"auth-int,auth\""),
     Digest("r", "n", "auth-int")},
    {"QopInCapitals", Line("Digest realm=\"r\", nonce=\"n\", qop=\"AUTH\""),
     Digest("r", "n", "AUTH")},
    {"UnknownQop", Line("Digest realm=\"r\", nonce=\"n\", qop=\"x y z\""),
     Digest("r", "n", "x y z")},
    {"AlgorithmMd5Sess", Line("Digest realm=\"r\", nonce=\"n\", algorithm=MD5-sess"),
     Digest("r", "n", "", "", "MD5-sess")},
    {"AlgorithmSha256", Line("Digest realm=\"r\", nonce=\"n\", qop=\"auth\", algorithm=SHA-256"),
     Digest("r", "n", "auth", "", "SHA-256")},
    {"BasicBeforeDigestInOneLine", Line("Basic realm=\"b\", Digest realm=\"d\", nonce=\"n\""),
     Digest("b", "n")},
    {"DigestBeforeBasicInOneLine", Line("Digest realm=\"d\", nonce=\"n\", Basic realm=\"b\""),
     Digest("d", "n")},
    {"BasicBeforeDigestInTwoLines",
     Line("Basic realm=\"b\"") + Line("Digest realm=\"d\", nonce=\"n\""), Digest("d", "n")},
    {"DigestBeforeBasicInTwoLines",
     Line("Digest realm=\"d\", nonce=\"n\"") + Line("Basic realm=\"b\""), Basic()},
    {"TwoDigestsInOneLine",
     Line("Digest realm=\"1\", nonce=\"1\", Digest realm=\"2\", nonce=\"2\", qop=auth"),
     Digest("1", "1", "auth")},
    {"TwoDigestsInTwoLines",
     Line("Digest realm=\"1\", nonce=\"1\", qop=\"auth\"") +
         Line("Digest realm=\"2\", nonce=\"2\""),
     Digest("2", "2")},
    {"DigestBeforeAnUnknownSchemeInTwoLines",
     Line("Digest realm=\"1\", nonce=\"1\"") + Line("Bearer realm=\"b\""),
     {}},
    {"TwentyNineBasicsAndADigest",
     [] {
       std::string lines;
       for (int i = 0; i < 28; ++i) lines += Line("Basic realm=\"b\"");
       return lines + Line("Digest realm=\"r\", nonce=\"n\"");
     }(),
     Digest("r", "n")},
    {"Bearer", Line("Bearer realm=\"b\", error=\"invalid_token\""), {}},
    {"Negotiate", Line("Negotiate"), {}},
    {"AnUnknownSchemeOf64KB", Line(std::string(kLongest, 'N')), {}},
    {"BearerThatSpeaksOfBasic", Line("Bearer realm=\"basics\""), Basic()},
    {"BasicWhoseRealmSpeaksOfDigest", Line("Basic realm=\"digestive\""), Digest("digestive", "")},
    {"ManyBlanks", Line(std::string(1500, ' ') + "Digest realm=\"r\", nonce=\"n\""),
     Digest("r", "n")},
    {"ABlankLineOfColons", ": ; = ;\r\n" + Line("Basic"), {}, HTTP_RET_NOT_READY},
    {"AnotherHeadersSuffix", "WWW-Authenticate-Too: Basic\r\n", Basic()},
    {"AProxysChallenge", "Proxy-Authenticate: Basic realm=\"p\"\r\n", {}},
    {"ABasicRealmOf64KB", Line("Basic realm=\"" + std::string(kLongest, 'b')), Basic()},
};

// Values of which the client sends some back. Control bytes go back as they came; what ends a line
// or a text for the reader cannot be in a value, so the next request is one head all the same.
std::vector<ChallengeCase> ControlByteCases() {
  std::string controls;
  for (char c = 1; c < ' '; ++c) {
    if (c != '\r' && c != '\n') controls += c;
  }
  controls += "\x7f\x80\xff";
  const std::string& s = controls;
  const std::string zero("\0", 1);
  const auto digest = [](const std::string& realm, const std::string& nonce) {
    return Line("Digest realm=\"" + realm + "\", nonce=\"" + nonce + "\"");
  };
  return {
      {"InTheRealm", digest(s, "n"), Digest(s, "n")},
      {"InTheNonce", digest("r", s), Digest("r", s)},
      {"InTheQop", Line("Digest realm=r, nonce=n, qop=" + s), Digest("r", "n", s)},
      {"InTheOpaque", Line("Digest realm=r, nonce=n, opaque=" + s), Digest("r", "n", "", s)},
      {"InTheAlgorithm", Line("Digest realm=r, nonce=n, algorithm=" + s),
       Digest("r", "n", "", "", s)},
      {"InTheCookie", "Set-Cookie: " + s + ";\r\n" + Line("Basic"), Basic(), HTTP_RET_OK, s + ";"},
      {"InTheScheme", Line(s + "Basic" + s), Basic()},
      {"InTheLocation", "Location: http://x/" + s + "\r\n" + Line("Basic"), Basic()},
      {"ACarriageReturnInTheRealm", digest("a\rXb", "n"), Digest("a", "")},
      {"ALineFeedInTheRealm", digest("a\nb", "n"), Digest("a", "")},
      {"ALineEndInTheNonce", digest("r", "a\r\nX-Evil: 1"), Digest("r", "a")},
      {"AnEmptyLineInTheNonce", digest("r", "a\r\n\r\nGET / HTTP/1.0"), Digest("r", "a")},
      {"ACarriageReturnInTheQop", Line("Digest realm=r, nonce=n, qop=auth\r\rX: 1"),
       Digest("r", "n", "auth")},
      {"ALineEndInTheOpaque", Line("Digest realm=r, nonce=n, opaque=\"o\r\nCookie: c\""),
       Digest("r", "n", "", "o")},
      {"AZeroByteInTheRealm", digest("a" + zero + "b", "n"), Digest("a", "")},
      {"AZeroByteInTheNonce", digest("r", "a" + zero + "b"), Digest("r", "a")},
      {"AZeroByteInTheOpaque", Line("Digest realm=r, nonce=n, opaque=o" + zero + "x"),
       Digest("r", "n", "", "o")},
      {"AZeroByteBeforeTheScheme", Line(zero + "Basic"), {}},
      {"ALineEndInTheCookie", "Set-Cookie: c=1;\r\nX-Evil: 1;\r\n" + Line("Basic"), Basic(),
       HTTP_RET_OK, "c=1;"},
      {"ACarriageReturnInTheCookie",
       "Set-Cookie: c=1\rX;\r\n" + Line("Basic"),
       {},
       HTTP_RET_NOT_READY},
      {"AZeroByteInTheCookie", "Set-Cookie: c=1;" + zero + "x;\r\n" + Line("Basic"), Basic(),
       HTTP_RET_OK, "c=1;"},
      {"ACookieThatComesFromInsideTheRealm", digest("a\r\nSet-Cookie: c=1;", "n"), Digest("a", ""),
       HTTP_RET_OK, "c=1;"},
  };
}

// The daemon's side of a login. What a daemon puts into a user name goes out as it stands.
std::vector<ChallengeCase> CredentialCases() {
  const std::string digest = Line("Digest realm=\"r\", nonce=\"n\", qop=\"auth\"");
  const Login login = Digest("r", "n", "auth");
  const std::string basic = Line("Basic");
  const std::string longest(kLongest, 'L');
  const std::string zero("a\0b", 3);
  const auto with = [](const char* name, const std::string& lines, const Login& expected,
                       const std::string& user, const std::string& password) {
    return ChallengeCase{name, lines, expected, HTTP_RET_UNAUTHORIZED, "", user, password};
  };
  return {
      with("DigestWithoutBoth", digest, login, "", ""),
      with("BasicWithoutBoth", basic, Basic(), "", ""),
      with("DigestWithQuotes", digest, login, "a\"b", "\"\"\""),
      with("BasicWithQuotes", basic, Basic(), "a\"b", "\"\"\""),
      with("DigestWithColons", digest, login, ":a:b:", "::"),
      with("BasicWithColons", basic, Basic(), ":a:b:", "::"),
      with("DigestWithBackslashes", digest, login, "a\\\"b\\", "\\"),
      with("DigestWithControlBytes", digest, login, "\x01\t\x7f\xff", "\x02\x1b"),
      with("BasicWithControlBytes", basic, Basic(), "\x01\t\x7f\xff", "\x02\r\n\x1b"),
      with("BasicWithALineEndInTheUser", basic, Basic(), "u\r\nX: 1", "p"),
      with("DigestWithALineEndInThePassword", digest, login, "u", "p\r\n\r\nX: 1"),
      with("DigestWithALineEndInTheUser", digest, login, "u\r\nX: 1", "p"),
      with("DigestWithAUserOf64KB", digest, login, longest, "p"),
      with("DigestWithAPasswordOf64KB", digest, login, "u", longest),
      with("BasicWithAUserOf64KB", basic, Basic(), longest, "p"),
      with("BasicWithAPasswordOf64KB", basic, Basic(), "u", longest),
      with("DigestWithAZeroByteInTheUser", digest, login, zero, "p"),
      with("DigestWithAZeroByteInThePassword", digest, login, "u", zero),
      with("BasicWithAZeroByteInTheUser", basic, Basic(), zero, "p"),
      with("BasicWithAZeroByteInThePassword", basic, Basic(), "u", zero),
  };
}

// Servers that are never content.
struct LoopCase {
  std::string name;
  int calls;                         // of SendRequest with one client
  std::vector<std::string> replies;  // one a connection
  std::vector<std::string> marks;    // that the request of each connection holds; "": no login
  Outcome last;
  bool basic_first = false;
};

std::ostream& operator<<(std::ostream& out, const LoopCase& test) {
  return out << test.name;
}

std::string DigestRefusal(const std::string& nonce, const std::string& more = "") {
  return Refusal(Line("Digest realm=\"r\", nonce=\"" + nonce + "\"" + more));
}

std::string WithNonce(const std::string& nonce) {
  return "nonce=\"" + nonce + "\"";
}

const Outcome kRefused = Sent(HTTP_RET_UNAUTHORIZED, 401, "");
const std::string kBasicLogin = "Authorization: Basic dXNlcjpwYXNz\r\n";
const std::string kBasicRefusal = Refusal(Line("Basic realm=\"r\""));

const LoopCase kLoops[] = {
    {"DigestForEver", 1, {DigestRefusal("1"), DigestRefusal("1")}, {"", WithNonce("1")}, kRefused},
    {"BasicForEver", 1, {kBasicRefusal, kBasicRefusal}, {"", kBasicLogin}, kRefused},
    {"BasicForEverAlthoughSentAtOnce",
     1,
     {kBasicRefusal, kBasicRefusal},
     {kBasicLogin, kBasicLogin},
     kRefused,
     true},
    {"NonceThatIsAlwaysStale",
     1,
     {DigestRefusal("1", ", stale=true"), DigestRefusal("2", ", stale=true")},
     {"", WithNonce("1")},
     kRefused},
    {"NonceThatChangesEachTime",
     3,
     {DigestRefusal("1"), DigestRefusal("2"), DigestRefusal("3"), DigestRefusal("4"),
      DigestRefusal("5"), DigestRefusal("6")},
     {"", WithNonce("1"), "", WithNonce("3"), "", WithNonce("5")},
     kRefused},
    {"SchemeThatChangesEachTime",
     2,
     {kBasicRefusal, DigestRefusal("1"), DigestRefusal("2"), kBasicRefusal},
     {"", kBasicLogin, "", WithNonce("2")},
     kRefused},
    {"A407",
     1,
     {"HTTP/1.1 407 Proxy\r\n" + Line("Basic") + "\r\n"},
     {""},
     Sent(HTTP_RET_BAD_RESPONSE, 407, "")},
    {"A407BehindTheLogin",
     1,
     {kBasicRefusal, "HTTP/1.1 407 Proxy\r\n" + Line("Basic") + "\r\n"},
     {"", kBasicLogin},
     Sent(HTTP_RET_BAD_RESPONSE, 407, "")},
    {"A401WithinASuccess", 1, {"HTTP/1.1 200 401\r\n" + Line("Basic") + "\r\n"}, {""}, Success("")},
    {"ARedirectBehindTheLogin",
     1,
     {kBasicRefusal, "HTTP/1.1 302 Found\r\nLocation: http://127.0.0.1/\r\n\r\n"},
     {"", kBasicLogin},
     Sent(HTTP_RET_REDIRECT, 302, "")},
    {"NothingBehindTheLogin",
     1,
     {kBasicRefusal, ""},
     {"", kBasicLogin},
     Sent(HTTP_RET_IO_ERROR, 0, "")},
    {"ARefusalWithoutAChallengeBehindTheLogin",
     2,
     {kBasicRefusal, Refusal(""), Refusal("")},
     {"", kBasicLogin, ""},
     kRefused},
};

std::vector<Script> ExchangesOf(const LoopCase& test) {
  std::vector<Script> scripts;
  for (const std::string& reply : test.replies) scripts.push_back(Exchange(reply));
  return scripts;
}

template <typename Case>
std::string NameOf(const ::testing::TestParamInfo<Case>& info) {
  return info.param.name;
}

class Challenges : public ::testing::TestWithParam<ChallengeCase> {};
class ChallengeLoops : public ::testing::TestWithParam<LoopCase> {};

}  // namespace

TEST_P(Challenges, AreAnsweredByTheGetAsTheTableSays) {
  PlayGet(GetParam());
}

TEST_P(Challenges, AreAnsweredByTheSoapPostAsTheTableSays) {
  PlayPost(GetParam());
}

INSTANTIATE_TEST_SUITE_P(OfBrokenFields, Challenges, ::testing::ValuesIn(FieldCases()),
                         NameOf<ChallengeCase>);
INSTANTIATE_TEST_SUITE_P(OfBrokenWholes, Challenges, ::testing::ValuesIn(kWhole),
                         NameOf<ChallengeCase>);
INSTANTIATE_TEST_SUITE_P(WithControlBytes, Challenges, ::testing::ValuesIn(ControlByteCases()),
                         NameOf<ChallengeCase>);
INSTANTIATE_TEST_SUITE_P(ForOddCredentials, Challenges, ::testing::ValuesIn(CredentialCases()),
                         NameOf<ChallengeCase>);

TEST_P(ChallengeLoops, EndAfterOneLoginACall) {
  const LoopCase& test = GetParam();
  ScriptedPeer peer(ExchangesOf(test));
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] {
    ClientSettings settings;
    settings.user = "user";
    settings.password = "pass";
    settings.basic_auth = test.basic_first;
    ClientProbe client(peer.Port(), settings);
    for (int i = 0; i < test.calls; ++i) {
      outcome = OutcomeOf(client, client.SendRequest(HTTP_METHOD_GET, ""));
    }
  });
  EXPECT_EQ(outcome, test.last);
  for (size_t i = 0; i < test.marks.size(); ++i) {
    const std::string request = peer.Received(i);
    EXPECT_THAT(request, HasSubstr(test.marks[i])) << i;
    EXPECT_EQ(request.find("Authorization") == std::string::npos, test.marks[i].empty()) << i;
  }
}

INSTANTIATE_TEST_SUITE_P(Hostile, ChallengeLoops, ::testing::ValuesIn(kLoops), NameOf<LoopCase>);

// libcurl answers challenges by itself; what it makes of broken ones is its own business, but for
// the number of its requests, their heads and the result.
namespace {

struct CurlCase {
  std::string name;
  std::vector<std::string> replies;  // one a request, each on a connection of its own
  int result;
};

std::ostream& operator<<(std::ostream& out, const CurlCase& test) {
  return out << test.name;
}

const std::string kCurlOk = "HTTP/1.1 200 OK\r\nConnection: close\r\nContent-Length: 0\r\n\r\n";

std::string CurlRefusal(const std::string& lines) {
  return Refusal(lines + "Connection: close\r\nContent-Length: 0\r\n");
}

std::vector<CurlCase> CurlTable() {
  const std::string sound = "Digest realm=\"r\", nonce=\"n\", qop=\"auth\"";
  const int ok = HTTP_RET_OK;
  const int refused = HTTP_RET_IO_ERROR;
  return {
      {"Sound", {CurlRefusal(Line(sound)), kCurlOk}, ok},
      {"NoChallenge", {CurlRefusal("")}, refused},
      {"DigestForEver", {CurlRefusal(Line(sound)), CurlRefusal(Line(sound))}, refused},
      {"DigestWithoutANonce", {CurlRefusal(Line("Digest realm=\"r\""))}, refused},
      {"BearerAlone", {CurlRefusal(Line("Bearer realm=\"r\""))}, refused},
      {"UnknownAlgorithm", {CurlRefusal(Line(sound + ", algorithm=QUEN"))}, refused},
      {"AQopOfControlBytes",
       {CurlRefusal(Line("Digest realm=\"r\", nonce=\"n\", qop=\"\x01\x7f\"")), kCurlOk},
       ok},
      {"AQuoteInTheRealm",
       {CurlRefusal(Line("Digest realm=\"a\\\"b\", nonce=\"n\"")), kCurlOk},
       ok},
      {"AChallengeOf64KB",
       {CurlRefusal(Line(sound + ", x=\"" + std::string(kLongest, 'x') + "\"")), kCurlOk},
       ok},
      {"ARedirectThatIsNotFollowed",
       {"HTTP/1.1 302 Found\r\nLocation: http://127.0.0.1:1/\r\nConnection: close\r\n"
        "Content-Length: 0\r\n\r\n"},
       refused},
      {"AProxysChallenge",
       {"HTTP/1.1 407 Proxy\r\nProxy-Authenticate: Basic\r\nConnection: close\r\n"
        "Content-Length: 0\r\n\r\n"},
       refused},
      {"AZeroByteInTheChallenge",
       {Refusal("WWW-Authenticate: Digest realm=\"r" + std::string(1, '\0') + "\"\r\n")},
       refused},
  };
}

class CurlChallenges : public ::testing::TestWithParam<CurlCase> {};

}  // namespace

TEST_P(CurlChallenges, EndAsTheTableSays) {
  const CurlCase& test = GetParam();
  std::vector<Script> scripts;
  for (const std::string& reply : test.replies) scripts.push_back(Exchange(reply));
  ScriptedPeer peer(scripts);
  int result = -1;
  RunOnSmallStack(kSmallStack, [&] {
    ClientSettings settings;
    settings.user = "user";
    settings.password = "pass";
    result = ClientProbe(peer.Port(), settings).SendReqByXMLGet(5);
  });
  EXPECT_EQ(result, test.result);
  peer.Finish();
  EXPECT_EQ(peer.Connections(), test.replies.size());
  for (size_t i = 0; i < test.replies.size(); ++i) ExpectOneHead({}, peer.Received(i));
}

INSTANTIATE_TEST_SUITE_P(Hostile, CurlChallenges, ::testing::ValuesIn(CurlTable()),
                         NameOf<CurlCase>);
