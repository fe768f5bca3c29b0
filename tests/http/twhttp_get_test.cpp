// The GET over the client's own socket.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/query_encoding.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

using namespace tarnwick;

using namespace std::string_literals;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\n\r\n";

// The request that a client with these settings sends.
std::string RequestOf(const ClientSettings& settings,
                      const std::function<void(ExposedClient&)>& prepare = {}) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port(), settings);
  if (prepare) prepare(client);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  return peer.Received(0);
}

// The request line of a client that encodes its query.
std::string EncodedTarget(const std::string& path, const std::string& keep = "") {
  ClientSettings settings;
  settings.path = path;
  settings.keep = keep;
  settings.encode_query = true;
  const std::string request = RequestOf(settings);
  return request.substr(5, request.find(" HTTP/1.0\r\n") - 5);
}

}  // namespace

TEST(SendRequestByGet, WithoutAVersionItSendsHttp10AndNoHost) {
  EXPECT_EQ(RequestOf({}), "GET /a.cgi HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n\r\n");
}

TEST(SendRequestByGet, WithHttp11TheHostFollowsTheCookieWithoutItsPort) {
  const auto prepare = [](ExposedClient& client) {
    client.SetCookie("s=1");
    client.m_strHost = "cam";
  };
  EXPECT_EQ(RequestOf({"a.cgi", HTTP_VERSION_1_1}, prepare),
            "GET /a.cgi HTTP/1.1\r\nUser-Agent: Quenrith Tarnwick\r\nCookie: s=1\r\n"
            "Host: cam\r\n\r\n");
}

TEST(SendRequestByGet, AnEmptyPathIsSentAsASlash) {
  EXPECT_EQ(RequestOf({""}), "GET / HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n\r\n");
}

TEST(SendRequestByGet, AStoredAuthorizationComesAfterTheCookieAndIsSentOnce) {
  ScriptedPeer peer({Exchange(kOk), Exchange(kOk)});
  ExposedClient client(peer.Port(), {"p", HTTP_VERSION_1_1});
  client.SetCookie("s=1");
  client.m_strAuthorization = "Authorization: X";
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_strAuthorization, "");
  client.SetCookie("s=1");
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(peer.Received(0),
            "GET /p HTTP/1.1\r\nUser-Agent: Quenrith Tarnwick\r\nCookie: s=1\r\n"
            "Authorization: X\r\nHost: 127.0.0.1\r\n\r\n");
  EXPECT_EQ(peer.Received(1),
            "GET /p HTTP/1.1\r\nUser-Agent: Quenrith Tarnwick\r\nCookie: s=1\r\n"
            "Host: 127.0.0.1\r\n\r\n");
}

TEST(SendRequestByGet, WithEncodingOnlyTheValuesOfTheQueryAreEncoded) {
  EXPECT_EQ(EncodedTarget("p?a=1 2"), "p?a=1%202");
  EXPECT_EQ(EncodedTarget("p?x"), "p?x");
  EXPECT_EQ(EncodedTarget("p"), "p");
  EXPECT_EQ(EncodedTarget("p?a=1&b"), "p?a=1&b");
  EXPECT_EQ(EncodedTarget("p?=v"), "p?=v");
  EXPECT_EQ(EncodedTarget("p?a=b=c"), "p?a=b%3Dc");
  EXPECT_EQ(EncodedTarget("p?a=b=c", "="), "p?a=b=c");
}

TEST(SendRequestByGet, ARequestOfMoreThan2047BytesIsCutThereAndIsTakenForSent) {
  ScriptedPeer peer({{ExpectBytes(2047), Send(kOk), ExpectEof()}});
  {
    ExposedClient client(peer.Port(), {std::string(3000, 'p')});
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
  }
  EXPECT_EQ(peer.Received(0), "GET /" + std::string(2042, 'p'));
}

TEST(SendRequestByGet, ARequestOf2047BytesIsSentWhole) {
  const std::string rest = " HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n\r\n";
  const std::string path(2047 - 5 - rest.size(), 'p');
  EXPECT_EQ(RequestOf({path}), "GET /" + path + rest);
}

TEST(SendRequestByGet, ARequestOf2048BytesLosesItsLastOne) {
  const std::string rest = " HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n\r\n";
  const std::string path(2048 - 5 - rest.size(), 'p');
  ScriptedPeer peer({{ExpectBytes(2047), Send(kOk), Close()}});
  ExposedClient client(peer.Port(), {path});
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(peer.Received(0) + "\n", "GET /" + path + rest);
}

TEST(SendRequestByGet, Http10IsSentForEveryVersionButHttp11) {
  for (const int version : {0, 1, 3, -1}) {
    EXPECT_EQ(RequestOf({"a", static_cast<HTTP_VERSION>(version)}),
              "GET /a HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n\r\n");
  }
}

TEST(SendRequestByGet, WithoutEncodingThePathIsSentAsItIs) {
  ClientSettings settings;
  settings.path = "p?a=1 2&b=/";
  EXPECT_THAT(RequestOf(settings), ::testing::StartsWith("GET /p?a=1 2&b=/ HTTP/1.0\r\n"));
}

TEST(SendRequestByGet, TheStoredPathIsNotEncodedItself) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientSettings settings;
  settings.path = "p?a=1 2";
  settings.encode_query = true;
  ExposedClient client(peer.Port(), settings);
  client.SendRequestByGet();
  EXPECT_EQ(client.m_strPath, "p?a=1 2");
}

TEST(SendRequestByGet, TheBodyIsLeftOnTheConnection) {
  const auto client = ClientAfter("HTTP/1.0 200 OK\r\nContent-Length: 4\r\n\r\nbody");
  EXPECT_EQ(client->m_connState, 2);
  EXPECT_EQ(ReadBody(*client), "body");
}

TEST(SendRequestByGet, EachRequestRunsOnAFreshConnection) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n\r\nunread"), DiscardUntilEnd()},
                     Exchange("HTTP/1.1 404 No\r\n\r\nsecond")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(client.m_statusCode, 404);
  EXPECT_EQ(ReadBody(client), "second");
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendRequestByGet, AFailedConnectIsLoggedAndChangesNoField) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  client.m_strAuthorization = "Authorization: X";
  client.m_connState = 2;
  client.m_result = HTTP_RET_REDIRECT;
  client.m_statusCode = 302;
  LogCapture log;
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_strAuthorization, "Authorization: X");
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_statusCode, 302);
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("debug", "SendRequestByGet", "Connection failed!\n")));
}

TEST(SendRequestByGet, AFailedWriteIsLoggedAndOnlyTheAuthorizationIsGone) {
  ScriptedPeer peer({{DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
  client.m_strAuthorization = "Authorization: X";
  client.m_result = HTTP_RET_REDIRECT;
  client.m_statusCode = 302;
  LogCapture log;
  {
    Faults faults;
    faults.FailNth(Call::kWrite, 1, EPIPE);
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(client.m_strAuthorization, "");
  EXPECT_EQ(client.m_connState, 0);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_statusCode, 302);
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("debug", "SendRequestByGet", "Write data faild.\n")));
}

TEST(SendRequestByGet, BelowDebugItsFailuresAreNotLogged) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  LogCapture log;
  log.SetLevel(kHttpCategory, 4);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}

TEST(SendRequestByGet, AShortWriteIsSuccess) {
  ScriptedPeer peer({{ExpectBytes(10), Send(kOk), DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
  Faults faults;
  faults.Limit(Call::kWrite, 10).FailRange(Call::kWrite, 2, 2, EIO);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  client.m_pSocket->Disconnect();
}

TEST(SendRequestByGet, AResponseThatCannotBeParsedIsNoFailure) {
  const auto client = ClientAfter("garbage\r\n\r\n");
  EXPECT_EQ(client->m_result, HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(client->m_connState, 1);
}

TEST(SendRequestByGet, InBlockingModeItWorksTheSame) {
  ClientSettings settings;
  settings.timeout = -1;
  EXPECT_EQ(RequestOf(settings), "GET /a.cgi HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n\r\n");
}

TEST(SendRequestByGetBadInput, AZeroByteInThePathEndsTheRequestThere) {
  ScriptedPeer peer({{ExpectExactly("GET /a"), Close()}});
  ExposedClient client(peer.Port());
  client.SetPath("a\0b"s);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
}

TEST(SendRequestByGetBadInput, PercentSignsInThePathAreNoFormat) {
  EXPECT_THAT(RequestOf({"%s%n%d"}), ::testing::StartsWith("GET /%s%n%d HTTP/1.0\r\n"));
}

namespace {

constexpr struct {
  const char* path;
  const char* keep;
  const char* encoded;
} kPaths[] = {
    {"cgi/a.cgi?name=a b&x=1/2", "", "cgi/a.cgi?name=a%20b&x=1%2F2"},
    {"cgi/a.cgi?name=a b&x=1/2", "/", "cgi/a.cgi?name=a%20b&x=1/2"},
    {"", "", ""},
    {"p", "", "p"},
    {"a b=c d", "", "a b=c d"},
    {"p?", "", "p?"},
    {"p?x y", "", "p?x y"},
    {"p?x y&a=1 2", "", "p?x y&a=1%202"},
    {"p?a=", "", "p?a="},
    {"p?a=&b=", "", "p?a=&b="},
    {"p?a=&b=x y", "", "p?a=&b=x%20y"},
    {"p?=v w", "", "p?=v w"},
    {"p?=v=w x", "", "p?=v=w%20x"},
    {"p?a=1&=2 3", "", "p?a=1&=2%203"},
    {"p?a=1&", "", "p?a=1&"},
    {"p?a=1&&b=2 3", "", "p?a=1&&b=2%203"},
    {"p?a=1 2&b c", "", "p?a=1%202&b c"},
    {"p?a b=1", "", "p?a b=1"},
    {"p?a=b=c", "", "p?a=b%3Dc"},
    {"p?a=b=c", "=", "p?a=b=c"},
    {"p?a=b?c", "", "p?a=b%3Fc"},
    {"p?a=b?c", "?", "p?a=b?c"},
    {"p?a=100%", "", "p?a=100%25"},
    {"p?a=100%", "%", "p?a=100%"},
    {"p?a=x\ty\nz", "\t\n ", "p?a=x%20y%20z"},
    {"p?a=\xc3\xa4", "", "p?a=%C3%A4"},
    {"p?a=_~()*,-.", "", "p?a=_~()*,-."},
    {"?a= ", "", "?a=%20"},
};

}  // namespace

TEST(EncodeQueryValues, TheTableOfPaths) {
  for (const auto& row : kPaths) {
    EXPECT_EQ(EncodeQueryValues(row.path, row.keep), row.encoded) << row.path;
  }
}

TEST(EncodeQueryValues, OnlyAPieceThatIsCopiedToTheEndStopsAtTheFirstZeroByte) {
  const struct {
    std::string path;
    std::string encoded;
  } table[] = {
      {"p?x\0y"s, "p?x"},
      {"p?a=1 2\0b=3 4"s, "p?a=1%202%00b%3D3%204"},
      {"p?a=1\0&b=2 3"s, "p?a=1%00&b=2%203"},
      {"p?a=\0&b=2"s, "p?a=%00"},
      {"p?\0a=1&b=2"s, "p?\0a=1"s},
      {"p?a=1&b\0c=2 3"s, "p?a=1&b\0c=2%203"s},
      {"p?a=1&b\0c=2&d=3"s, "p?a=1&b\0c=2"s},
      {"p?a=1&b\0c"s, "p?a=1&b"},
      {"p\0q?a=1 2&b"s, "p\0q?a=1%202"s},
      {"p\0q?x"s, "p\0q?"s},
      {"p\0x"s, "p\0x"s},
  };
  for (const auto& row : table) {
    EXPECT_EQ(EncodeQueryValues(row.path, ""), row.encoded) << testing::PrintToString(row.path);
  }
}

TEST(SendRequestByGet, AZeroByteInAValueGoesOutEscapedAndOneInANameCutsTheRequest) {
  EXPECT_EQ(EncodedTarget("p?a=1 2\0b=3 4"s), "p?a=1%202%00b%3D3%204");
  const std::string cut = "GET /p?a=1&b";
  ScriptedPeer peer({{ExpectExactly(cut), Send(kOk), Close()}});
  ClientSettings settings;
  settings.path = "p?a=1&b\0c=2"s;
  settings.encode_query = true;
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  client.m_pSocket->Disconnect();
  EXPECT_EQ(peer.Received(0), cut);
}
