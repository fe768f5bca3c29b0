// The examples at the head of tarnwick/http/twhttp.h do what they say, with servers that keep their
// connections.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "docs/man/examples/examples.h"
#include "tests/support/files.h"
#include "tests/support/ports.h"
#include "tests/support/scripted_peer.h"

using ::testing::HasSubstr;
using ::testing::SizeIs;

namespace {

// What stands indented in the comment at a file's head, indented as in a function instead.
std::vector<std::string> ExamplesOf(const std::string& header) {
  std::vector<std::string> examples;
  bool goes_on = false;
  std::istringstream lines(header);
  for (std::string line; std::getline(lines, line) && line.compare(0, 2, "//") == 0;) {
    const bool indented = line.compare(0, 5, "//   ") == 0;
    if (indented && !goes_on) examples.emplace_back();
    if (indented) examples.back() += "  " + line.substr(5) + "\n";
    goes_on = indented;
  }
  return examples;
}

// Answers a request as servers do that keep a connection of HTTP/1.1 and close one of HTTP/1.0.
Step AnswerAndKeep(const std::string& response) {
  return {"AnswerAndKeep()", [response](PeerConnection& peer, std::string* error) {
            while (peer.Pending().find("\r\n\r\n") == std::string::npos) {
              if (peer.ReadMore() != PeerConnection::Read::kData) return false;
            }
            const bool kept = peer.Pending().find(" HTTP/1.1\r\n") != std::string::npos;
            peer.Pending().clear();
            if (!peer.Write(response)) return false;
            if (kept) return StallUntilFinish().play(peer, error);
            peer.Close();
            return true;
          }};
}

constexpr char kChallenge[] =
    "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: Basic realm=\"gate\"\r\n"
    "Content-Length: 0\r\n\r\n";

}  // namespace

TEST(HttpHeader, ItsExamplesAreThoseThatAreRun) {
  const std::string directory = TARNWICK_SOURCE_FOLDER;
  const std::string source = ReadFile(directory + "/docs/man/examples/http.cpp");
  const std::vector<std::string> examples =
      ExamplesOf(ReadFile(directory + "/tarnwick/http/twhttp.h"));
  EXPECT_THAT(examples, SizeIs(2));
  for (const std::string& example : examples) EXPECT_THAT(source, HasSubstr(example));
}

TEST(HttpHeader, APageComesWholeFromAServerThatKeepsItsConnections) {
  ScriptedPeer peer({{AnswerAndKeep(kChallenge)},
                     {AnswerAndKeep("HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\npage")}});
  EXPECT_EQ(InfoPage("127.0.0.1", peer.Port()), "page");
  EXPECT_THAT(peer.Received(1), HasSubstr("Authorization: Basic "));
}

TEST(HttpHeader, APageComesWholeFromAServerThatSendsChunksAndKeepsTheConnection) {
  ScriptedPeer peer({{ExpectRequest(),
                      Send("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n"
                           "4\r\npage\r\n0\r\n\r\n"),
                      StallUntilFinish()}});
  EXPECT_EQ(InfoPage("127.0.0.1", peer.Port()), "page");
}

TEST(HttpHeader, RefusedCredentialsAndAClosedPortHaveNoPage) {
  ScriptedPeer peer({Exchange(kChallenge), Exchange(kChallenge)});
  EXPECT_EQ(InfoPage("127.0.0.1", peer.Port()), "");
  const ClosedPort closed;
  EXPECT_EQ(InfoPage("127.0.0.1", closed.Port()), "");
}

TEST(HttpHeader, AJsonServiceReturnsItsNumber) {
  ScriptedPeer peer({{AnswerAndKeep("HTTP/1.1 200 OK\r\n\r\n{\"success\":true,\"camera\":7}")},
                     {AnswerAndKeep("HTTP/1.1 200 OK\r\n\r\n{\"success\":false}")}});
  EXPECT_EQ(CameraNumber("127.0.0.1", peer.Port()), 7);
  EXPECT_EQ(CameraNumber("127.0.0.1", peer.Port()), -1);
}
