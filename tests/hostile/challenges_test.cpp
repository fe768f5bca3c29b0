// Servers whose challenges are broken, huge or meant to break the next request.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/hostile/challenge_cases.h"
#include "tests/hostile/hostile_util.h"
#include "tests/model/digest.h"

namespace {

using ::testing::IsEmpty;

Challenge Digest(const std::string& realm, const std::string& nonce, const std::string& qop = "",
                 const std::string& opaque = "", const std::string& algorithm = "") {
  return {Scheme::kDigest, realm, nonce, qop, opaque, algorithm};
}

Challenge Basic() {
  return {Scheme::kBasic};
}

const char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\ndone";

// A request is refused with the challenge, and the one that follows, of a known length, is not.
std::vector<Script> RefuseOnce(const ChallengeCase& test, size_t next_length) {
  std::vector<Script> scripts = {Exchange(Refusal(test.lines))};
  if (test.challenge.scheme == Scheme::kNone) return scripts;
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
  if (test.challenge.scheme != Scheme::kNone) return Success(text);
  return {result, test.response, 401, ""};
}

void PlayGet(const ChallengeCase& test) {
  const LogCapture log(5);
  ScriptedPeer peer(RefuseOnce(test, ExpectedGet(test, "").size()));
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] {
    ExposedClient client(peer.Port(), SettingsOf(test));
    const int result = client.SendRequest(HTTP_METHOD_GET, "");
    outcome = OutcomeOf(client, result);
    if (outcome.status == 200) outcome.text = ReadBody(client);
  });
  EXPECT_EQ(outcome, ExpectedOutcome(test, HTTP_RET_OK, "done"));
  EXPECT_THAT(HttpLog(log), IsEmpty());
  if (test.challenge.scheme == Scheme::kNone) return;
  const std::string sent = peer.Received(1);
  EXPECT_EQ(sent, ExpectedGet(test, sent));
  ExpectOneHead(test, sent);
}

void PlayPost(const ChallengeCase& test) {
  const LogCapture log(5);
  ScriptedPeer peer(RefuseOnce(test, ExpectedPost(test, "").size()));
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] {
    ExposedClient client(peer.Port(), SettingsOf(test));
    std::string response;
    const int result = client.SendAuthReqBySocketPost(kSoapBody, response);
    outcome = OutcomeOf(client, result, response);
  });
  EXPECT_EQ(outcome, ExpectedOutcome(test, HTTP_RET_IO_ERROR, "done"));
  EXPECT_THAT(HttpLog(log), IsEmpty());
  if (test.challenge.scheme == Scheme::kNone) return;
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

void Store(Challenge* challenge, const std::string& field, const std::string& value) {
  if (field == "realm") challenge->realm = value;
  if (field == "nonce") challenge->nonce = value;
  if (field == "qop") challenge->qop = value;
  if (field == "opaque") challenge->opaque = value;
  if (field == "algorithm") challenge->algorithm = value;
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
  test.challenge.scheme = Scheme::kDigest;
  std::string challenge;
  for (const std::string& field : kFields) {
    const bool sound = field != broken;
    const std::string value = field == "qop" ? "auth" : field + "-value";
    challenge += (challenge.empty() ? "Digest " : ", ");
    challenge += sound ? field + "=\"" + value + "\"" : shape.text(field);
    Store(&test.challenge, field, sound ? value : shape.value(field));
  }
  test.lines = Line(challenge);
  return test;
}

// A field of 64 KB: the line is read up to its limit, and the fields after it are lost with the rest.
ChallengeCase LongFieldCase(const std::string& longest) {
  ChallengeCase test;
  test.name = CaseName(longest, "Of64KB");
  test.challenge.scheme = Scheme::kDigest;
  std::string line = "WWW-Authenticate: Digest ";
  for (const std::string& field : kFields) {
    line += field + "=\"";
    if (field == longest) break;
    const std::string value = field == "qop" ? "auth" : field + "-value";
    Store(&test.challenge, field, value);
    line += value + "\", ";
  }
  Store(&test.challenge, longest, std::string(kLineLimit - line.size(), 'A'));
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
    {"WithoutABlankAfterTheColon", "WWW-Authenticate:Basic\r\n", Basic()},
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

// The daemon's own credentials. What a daemon puts into a user name goes out as it stands.
std::vector<ChallengeCase> CredentialCases() {
  const std::string digest = Line("Digest realm=\"r\", nonce=\"n\", qop=\"auth\"");
  const Challenge challenge = Digest("r", "n", "auth");
  const std::string basic = Line("Basic");
  const std::string longest(kLongest, 'L');
  const std::string zero("a\0b", 3);
  const auto with = [](const char* name, const std::string& lines, const Challenge& expected,
                       const std::string& user, const std::string& password) {
    return ChallengeCase{name, lines, expected, HTTP_RET_UNAUTHORIZED, "", user, password};
  };
  return {
      with("DigestWithoutBoth", digest, challenge, "", ""),
      with("BasicWithoutBoth", basic, Basic(), "", ""),
      with("DigestWithQuotes", digest, challenge, "a\"b", "\"\"\""),
      with("BasicWithQuotes", basic, Basic(), "a\"b", "\"\"\""),
      with("DigestWithColons", digest, challenge, ":a:b:", "::"),
      with("BasicWithColons", basic, Basic(), ":a:b:", "::"),
      with("DigestWithBackslashes", digest, challenge, "a\\\"b\\", "\\"),
      with("DigestWithControlBytes", digest, challenge, "\x01\t\x7f\xff", "\x02\x1b"),
      with("BasicWithControlBytes", basic, Basic(), "\x01\t\x7f\xff", "\x02\r\n\x1b"),
      with("BasicWithALineEndInTheUser", basic, Basic(), "u\r\nX: 1", "p"),
      with("DigestWithALineEndInThePassword", digest, challenge, "u", "p\r\n\r\nX: 1"),
      with("DigestWithALineEndInTheUser", digest, challenge, "u\r\nX: 1", "p"),
      with("DigestWithAUserOf64KB", digest, challenge, longest, "p"),
      with("DigestWithAPasswordOf64KB", digest, challenge, "u", longest),
      with("BasicWithAUserOf64KB", basic, Basic(), longest, "p"),
      with("BasicWithAPasswordOf64KB", basic, Basic(), "u", longest),
      with("DigestWithAZeroByteInTheUser", digest, challenge, zero, "p"),
      with("DigestWithAZeroByteInThePassword", digest, challenge, "u", zero),
      with("BasicWithAZeroByteInTheUser", basic, Basic(), zero, "p"),
      with("BasicWithAZeroByteInThePassword", basic, Basic(), "u", zero),
  };
}

class Challenges : public ::testing::TestWithParam<ChallengeCase> {};

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
