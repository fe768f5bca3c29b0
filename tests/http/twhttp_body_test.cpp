// ReadBody: the body of a response.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>

#include "tests/http/body_test_util.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

using namespace std::string_literals;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

struct Body {
  int result;
  std::string text;
};

bool operator==(const Body& a, const Body& b) {
  return a.result == b.result && a.text == b.text;
}

std::ostream& operator<<(std::ostream& out, const Body& body) {
  return out << body.result << ", [" << body.text.substr(0, 200) << "] of " << body.text.size();
}

Body BodyOf(TWHttpClient& client) {
  Body body = {-1, ""};
  body.result = client.ReadBody(body.text);
  return body;
}

// The body that ReadBody returns after a GET.
Body BodyOfResponse(const std::string& response, const Transport& transport = {false, true}) {
  const auto peer = NewPeer(transport, {Exchange(response)});
  ExposedClient client(peer->Port(), SettingsOf(transport));
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  return BodyOf(client);
}

// Makes every read of the body fail once the bytes right after the head have come. A
// buffered client has it already; a direct one has read just the head.
void FailReadsAfter(Faults& faults, const Transport& transport) {
  faults.FailFrom(transport.tls ? Call::kSslRead : Call::kRead, transport.buffered ? 1 : 2);
}

}  // namespace

// Which one to call.

TEST(ReadBody, ItServesAfterEachSenderThatReadsTheHead) {
  ForEachTransport([](const Transport& transport) {
    for (const std::string& response : {Plain("Wikipedia"), Chunked(kWikipedia)}) {
      EXPECT_EQ(BodyOfResponse(response, transport), (Body{HTTP_RET_OK, "Wikipedia"}));
      const auto peer = NewPeer(transport, {Exchange(response), Exchange(response)});
      ExposedClient client(peer->Port(), SettingsOf(transport));
      EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
      EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_OK, "Wikipedia"}));
      EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
      EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_OK, "Wikipedia"}));
    }
  });
}

TEST(ReadBody, WhatTheStringHeldBeforeIsReplaced) {
  const auto client = ClientAfter(Plain("new"));
  std::string body = "old";
  EXPECT_EQ(client->ReadBody(body), HTTP_RET_OK);
  EXPECT_EQ(body, "new");
}

TEST(ReadBody, AfterAChallengeItReturnsTheSecondBody) {
  ScriptedPeer peer(
      {{ExpectRequest(), Send("HTTP/1.1 401 No\r\nWWW-Authenticate: Basic x\r\n\r\nfirst"),
        DiscardUntilEnd()},
       Exchange(Plain("second"))});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
  EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_OK, "second"}));
}

TEST(ReadBody, TheBodyOfAFailureIsReadAsWell) {
  EXPECT_EQ(BodyOfResponse("HTTP/1.1 500 Oops\r\n\r\nreason"), (Body{HTTP_RET_OK, "reason"}));
}

TEST(ReadBody, WithoutAHeadItIsAnIoError) {
  ExposedClient without_socket;
  EXPECT_EQ(BodyOf(without_socket), (Body{HTTP_RET_IO_ERROR, ""}));
  ExposedClient unconnected(1);
  EXPECT_EQ(BodyOf(unconnected), (Body{HTTP_RET_IO_ERROR, ""}));
  EXPECT_EQ(BodyOfResponse("HTTP/1.1 200 OK\r\nContent-Type:\r\n\r\nbody"),
            (Body{HTTP_RET_IO_ERROR, ""}));
}

TEST(ReadBody, WithoutAHeadTheChunkedCodingOfAnEarlierResponseDoesNotMakeItSucceed) {
  ScriptedPeer peer({Exchange(Chunked(kWikipedia)), RequestThenClose()});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_IO_ERROR, ""}));
}

// A body without chunks.

TEST(ReadBody, ItEndsWhereTheServerClosesWhateverTheLength) {
  EXPECT_EQ(BodyOfResponse("HTTP/1.1 200 OK\r\nContent-Length: 2\r\n\r\nlonger"),
            (Body{HTTP_RET_OK, "longer"}));
  EXPECT_EQ(BodyOfResponse("HTTP/1.1 200 OK\r\nContent-Length: 99\r\n\r\nshort"),
            (Body{HTTP_RET_OK, "short"}));
  EXPECT_EQ(BodyOfResponse("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"),
            (Body{HTTP_RET_OK, ""}));
}

TEST(ReadBody, ZeroBytesAreKept) {
  ForEachTransport([](const Transport& transport) {
    EXPECT_EQ(BodyOfResponse(Plain("a\0b\0"s), transport), (Body{HTTP_RET_OK, "a\0b\0"s}));
    EXPECT_EQ(BodyOfResponse(Chunked("4\r\na\0b\0\r\n0\r\n\r\n"s), transport),
              (Body{HTTP_RET_OK, "a\0b\0"s}));
  });
}

TEST(ReadBody, BodiesAroundThePieceOf8192BytesArriveWhole) {
  ForEachTransport([](const Transport& transport) {
    for (const size_t size : {8191, 8192, 8193, 100000}) {
      std::string body(size, '.');
      for (size_t i = 0; i < size; ++i) body[i] = static_cast<char>(i * 7);
      EXPECT_TRUE(BodyOfResponse(Plain(body), transport) == (Body{HTTP_RET_OK, body})) << size;
      char line[16];
      snprintf(line, sizeof(line), "%zx\r\n", size);
      const std::string chunks = line + body + "\r\n3\r\nend\r\n0\r\n\r\n";
      EXPECT_TRUE(BodyOfResponse(Chunked(chunks), transport) == (Body{HTTP_RET_OK, body + "end"}))
          << size;
    }
  });
}

TEST(ReadBody, AReadErrorIsAnIoErrorWithWhatCameBefore) {
  ForEachTransport([](const Transport& transport) {
    const auto peer = NewPeer(transport, {Exchange(Plain("part"))});
    ExposedClient client(peer->Port(), SettingsOf(transport));
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    LogCapture log;
    {
      Faults faults;
      FailReadsAfter(faults, transport);
      EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_IO_ERROR, "part"}));
    }
    EXPECT_THAT(log.Lines("http"),
                ElementsAre(IsHttpLog("debug", "ReadBody", "Read data error\n")));
  });
}

// Chunks.

TEST(ReadBody, ATransferEncodingOfExactlyChunkedIsDecodedAndNoOther) {
  for (const char* value : {"CHUNKED", "gzip, chunked", "chunked, gzip", "chunked;q=1", "chunke",
                            "chunkedd", "identity"}) {
    EXPECT_EQ(
        BodyOfResponse("HTTP/1.1 200 OK\r\nTransfer-Encoding: "s + value + "\r\n\r\n" + kWikipedia),
        (Body{HTTP_RET_OK, kWikipedia}))
        << value;
  }
  EXPECT_EQ(BodyOfResponse("HTTP/1.1 200 OK\r\ntransfer-encoding:  chunked \r\n\r\n"s + kWikipedia),
            (Body{HTTP_RET_OK, "Wikipedia"}));
}

TEST(ReadBody, AChunkedResponseSplitAtAnyByteHasTheSameBody) {
  const std::string response = Chunked(kWikipedia);
  const size_t first = response.size() - strlen(kWikipedia) - 2;
  for (size_t split = first; split < response.size(); ++split) {
    for (const bool buffered : {false, true}) {
      ScriptedPeer peer({ExchangeInPieces({response.substr(0, split), response.substr(split)})});
      ExposedClient client(peer.Port(), SettingsOf({false, buffered}));
      EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
      EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_OK, "Wikipedia"})) << split;
      peer.Finish();  // the client stays open for the line that it does not read
    }
  }
}

TEST(ReadBody, AChunkedResponseReadInPiecesOfAnySizeHasTheSameBody) {
  const std::string response = Chunked(kWikipedia);
  for (size_t size = 1; size <= response.size(); ++size) {
    Faults faults;
    faults.Limit(Call::kRead, size);
    EXPECT_EQ(BodyOfResponse(response), (Body{HTTP_RET_OK, "Wikipedia"})) << size;
  }
}

TEST(ReadBody, AChunkedResponseThatComesByteByByteHasTheSameBody) {
  ForEachTransport([](const Transport& transport) {
    const auto peer = NewPeer(transport, {ExchangeByteByByte(Chunked(kWikipedia))});
    ExposedClient client(peer->Port(), SettingsOf(transport));
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_OK, "Wikipedia"}));
    peer->Finish();  // the client stays open for the line that it does not read
  });
}

TEST(ReadBody, AChunkSizeWith0xInFrontEndsTheBody) {
  EXPECT_EQ(BodyOfResponse(Chunked("0x4\r\nWiki\r\n0\r\n\r\n")), (Body{HTTP_RET_OK, ""}));
}

TEST(ReadBody, AChunkSizeOfTheHighestBitsIsReadUntilTheServerCloses) {
  ForEachTransport([](const Transport& transport) {
    for (const char* size : {"80000000", "ffffffff", "7FFFFFFF"}) {
      EXPECT_EQ(BodyOfResponse(Chunked(size + "\r\nWiki"s), transport), (Body{HTTP_RET_OK, "Wiki"}))
          << size;
    }
  });
}

TEST(ReadBody, OfAChunkSizeTheLast32BitsAreTaken) {
  EXPECT_EQ(BodyOfResponse(Chunked("100000001\r\nW\r\n0\r\n\r\n")), (Body{HTTP_RET_OK, "W"}));
  EXPECT_EQ(BodyOfResponse(Chunked("100000000\r\nW\r\n0\r\n\r\n")), (Body{HTTP_RET_OK, ""}));
}

TEST(ReadBody, AnEmptyOrSpacedChunkSizeLineEndsTheBody) {
  EXPECT_EQ(BodyOfResponse(Chunked("1\r\nW\r\n\r\n4\r\nikip\r\n")), (Body{HTTP_RET_OK, "W"}));
  EXPECT_EQ(BodyOfResponse(Chunked("1\r\nW\r\n 4\r\nikip\r\n")), (Body{HTTP_RET_OK, "W"}));
  EXPECT_EQ(BodyOfResponse(Chunked("1\r\nW\r\n")), (Body{HTTP_RET_OK, "W"}));
  EXPECT_EQ(BodyOfResponse(Chunked("")), (Body{HTTP_RET_OK, ""}));
}

TEST(ReadBody, LineFeedsAloneEndChunkSizeLines) {
  EXPECT_EQ(BodyOfResponse(Chunked("4\nWiki\r\n1\nx\r\n0\n")), (Body{HTTP_RET_OK, "Wikix"}));
}

TEST(ReadBody, TheTwoBytesAfterAChunkAreDroppedWhateverTheyAre) {
  EXPECT_EQ(BodyOfResponse(Chunked("4\r\nWikiXY5\r\npediaZZ0\r\n\r\n")),
            (Body{HTTP_RET_OK, "Wikipedia"}));
}

TEST(ReadBody, AChunkSizeLineEndsAfter8192Bytes) {
  const std::string line = "5;" + std::string(8190, 'x');  // the last byte is lost
  EXPECT_EQ(BodyOfResponse(Chunked(line + "pedia\r\n0\r\n\r\n")), (Body{HTTP_RET_OK, "pedia"}));
}

TEST(ReadBody, TrailerLinesAreLeftOnTheConnection) {
  ForEachTransport([](const Transport& transport) {
    const auto peer = NewPeer(transport, {Exchange(Chunked("1\r\nW\r\n0\r\nX: y\r\n\r\n"))});
    ExposedClient client(peer->Port(), SettingsOf(transport));
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_OK, "W"}));
    EXPECT_EQ(ReadBody(client), "X: y\r\n\r\n");
  });
}

TEST(ReadBody, ATransferEncodingStaysForALaterResponseWithoutOne) {
  ScriptedPeer peer({Exchange(Chunked(kWikipedia)), Exchange(Plain("3\r\nabc\r\n0\r\n\r\n")),
                     Exchange(Plain("hello"))});
  ExposedClient client(peer.Port());
  std::vector<std::string> bodies;
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    bodies.push_back(BodyOf(client).text);
  }
  EXPECT_THAT(bodies, ElementsAre("Wikipedia", "abc", ""));
}

TEST(ReadBody, AReadErrorInTheMiddleOfAChunkIsAnIoErrorWithWhatCameBefore) {
  ForEachTransport([](const Transport& transport) {
    const auto peer = NewPeer(transport, {Exchange(Chunked("9\r\npart"))});
    ExposedClient client(peer->Port(), SettingsOf(transport));
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    LogCapture log;
    {
      Faults faults;
      const int line = transport.buffered ? 0 : 3;  // "9", carriage return, line feed
      faults.FailFrom(transport.tls ? Call::kSslRead : Call::kRead,
                      line + (transport.buffered ? 1 : 2));
      EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_IO_ERROR, "part"}));
    }
    EXPECT_THAT(log.Lines("http"),
                ElementsAre(IsHttpLog("debug", "ReadBody", "Read data error\n")));
  });
}

TEST(ReadBody, AReadErrorInPlaceOfAChunkSizeEndsTheBodyWithSuccess) {
  ForEachTransport([](const Transport& transport) {
    const auto peer = NewPeer(transport, {Exchange(Chunked("4\r\nWiki\r\n"))});
    ExposedClient client(peer->Port(), SettingsOf(transport));
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    LogCapture log;
    log.SetLevel(kHttpCategory, 5);
    Faults faults;
    // A direct client: three reads of a line, one of the data, one of the two bytes after it.
    faults.FailFrom(transport.tls ? Call::kSslRead : Call::kRead, transport.buffered ? 1 : 6);
    EXPECT_EQ(BodyOf(client), (Body{HTTP_RET_OK, "Wiki"}));
    EXPECT_THAT(log.Lines("http"), IsEmpty());
  });
}

TEST(ReadBody, AResetInTheMiddleOfAChunkIsAnErrorUnlessAReadHasGivenBytesBefore) {
  for (const bool buffered : {false, true}) {
    const Flag head_read;
    ScriptedPeer peer({{ExpectRequest(), Send(Chunked("9\r\npa")), WaitFor(head_read), Reset()}});
    ExposedClient client(peer.Port(), SettingsOf({false, buffered}));
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    head_read.Set();
    peer.Finish();
    // The buffered read ends short at the reset; the next one finds the end of the stream.
    EXPECT_EQ(BodyOf(client), (Body{buffered ? HTTP_RET_OK : HTTP_RET_IO_ERROR, "pa"}));
  }
}
