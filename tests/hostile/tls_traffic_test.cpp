// TLS servers that break the rules after the handshake: odd records, odd protocols, odd ends.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <string>
#include <vector>

#include "tests/hostile/hostile_util.h"
#include "tests/hostile/server_tls.h"
#include "tests/hostile/tls_cases.h"

namespace {

// After the handshake.

struct TrafficCase {
  std::string name;
  std::function<Script()> peer;
  Outcome expected;              // the text is the body, with "|" where a read failed
  std::vector<std::string> log;  // of the TLS socket
  int timeout = 9;               // of the client, in seconds
};

std::ostream& operator<<(std::ostream& out, const TrafficCase& test) {
  return out << test.name;
}

const std::string kHead = "HTTP/1.0 200 OK\r\nX: y\r\n\r\n";
const std::string kResponse = kHead + "body";
const Outcome kWhole = Success("body");
const Outcome kNoBody = Success("");
const Outcome kUnread = {HTTP_RET_OK, HTTP_RET_IO_ERROR, 0, "|"};
const Outcome kBodyUnread = {HTTP_RET_OK, HTTP_RET_OK, 200, "|"};

std::string ReadFailure(int error) {
  return "error _Read: Read error [" + std::to_string(error) + "]";
}

Outcome GetOverTls(int port, int timeout) {
  ClientSettings settings;
  settings.https = true;
  settings.timeout = timeout;
  ExposedClient client(port, settings);
  Outcome outcome = OutcomeOf(client, client.SendRequestByGet());
  char piece[4096];
  int count = -1;
  while ((count = client.ReadData(piece, sizeof(piece))) > 0) {
    outcome.text.append(piece, static_cast<size_t>(count));
  }
  if (count < 0) outcome.text += "|";
  return outcome;
}

// Serves a request by `response`, then ends the stream.
TrafficCase Serves(const std::string& name, int version,
                   const std::function<Script(const SharedTls&)>& response, const Outcome& expected,
                   const std::vector<std::string>& log = {}) {
  const auto peer = [version, response] {
    const SharedTls tls = TlsOf(version);
    const Script begin = {FinishHandshake(tls), ExpectTlsRequest(tls)};
    return Concat(Concat(begin, response(tls)), EndOfStream());
  };
  return {name, peer, expected, log};
}

// As above, by records made by hand.
TrafficCase ServesRecords(const std::string& name,
                          const std::function<std::string(ServerTls&)>& make,
                          const Outcome& expected, const std::vector<std::string>& log = {}) {
  return Serves(
      name, TLS1_2_VERSION, [make](const SharedTls& tls) { return Script{SendMade(tls, make)}; },
      expected, log);
}

// More than 10,000 empty records between the bytes of a response.
std::string ResponseAmongEmptyRecords(ServerTls& tls) {
  std::string records;
  for (const char byte : kHead + std::string(400, 'b')) {
    records += InOrder({EmptyRecords(tls, 30), Data(tls, std::string(1, byte))});
  }
  return records;
}

const std::string kNoRenegotiation = {1, 90};  // a warning
const std::vector<std::string> kFailed = {ReadFailure(kProtocol)};

// A fatal alert reads as the end of the stream: OpenSSL returns 0 for it.
const std::vector<TrafficCase> kRecords = {
    ServesRecords(
        "OneRecord", [](ServerTls& tls) { return Data(tls, kResponse); }, kWhole),
    ServesRecords(
        "ARecordAByte",
        [](ServerTls& tls) {
          std::string records;
          for (const char byte : kResponse) records += Data(tls, std::string(1, byte));
          return records;
        },
        kWhole),
    ServesRecords(
        "TenThousandEmptyRecords",
        [](ServerTls& tls) {
          return InOrder({EmptyRecords(tls, 10000), Data(tls, kResponse)});
        },
        kUnread, kFailed),
    ServesRecords(
        "TenThousandEmptyRecordsAfterTheHead",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), EmptyRecords(tls, 10000)});
        },
        kBodyUnread, kFailed),
    ServesRecords("TwelveThousandEmptyRecordsAmongTheBytes", ResponseAmongEmptyRecords,
                  Success(std::string(400, 'b'))),
    ServesRecords(
        "ARecordOf16384Bytes",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), Data(tls, std::string(16384, 'b'))});
        },
        Success(std::string(16384, 'b'))),
    ServesRecords(
        "ARecordOf16385Bytes",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), Data(tls, std::string(16385, 'b'))});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "AHeaderOf65535Bytes",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), "\x17\x03\x03\xff\xff", kResponse});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "ARecordOfNoKey",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), RawRecord(kDataRecord, kResponse)});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "PlainText", [](ServerTls&) { return kResponse; }, kUnread, kFailed),
    ServesRecords("ARecordThatCameBefore",
                  [](ServerTls& tls) {
                    const std::string record = Data(tls, kResponse);
                    return record + record;
                  },
                  Success("body|"),
                  {ReadFailure(kProtocol), ReadFailure(kSystem), ReadFailure(kSystem)}),
    ServesRecords(
        "ARecordOfAnUnknownType",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), tls.Encrypted(99, "x")});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "AChangeOfTheCipher",
        [](ServerTls& tls) { return tls.Encrypted(kChangeCipherRecord, "\x01"); }, kUnread,
        kFailed),
    ServesRecords(
        "AHeartbeat",
        [](ServerTls& tls) {
          return InOrder({tls.Encrypted(24, {1, 64, 0}), Data(tls, kResponse)});
        },
        kUnread, kFailed),
    ServesRecords(
        "ThreeWarnings",
        [](ServerTls& tls) {
          return InOrder({Alerts(tls, 3, kNoRenegotiation), Data(tls, kResponse)});
        },
        kWhole),
    ServesRecords(
        "TenThousandWarnings",
        [](ServerTls& tls) {
          return InOrder({Alerts(tls, 10000, kNoRenegotiation), Data(tls, kResponse)});
        },
        kUnread, kFailed),
    ServesRecords(
        "AnAlert",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), Alerts(tls, 1, {2, 80})});
        },
        Success(""), kFailed),
    ServesRecords(
        "AnEmptyAlert",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), Alerts(tls, 1, "")});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "AnAlertOf100Bytes",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), Alerts(tls, 1, std::string(100, '\x01'))});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "AHandshakeMessageOfNoUse",
        [](ServerTls& tls) {
          return InOrder({tls.Encrypted(kHandshakeRecord, HandshakeMessage(20, 12, "finished....")),
                          Data(tls, kResponse)});
        },
        kUnread, kFailed),
};

// Sends what `make` returns, one raw byte at a time.
Step SendMadeByteByByte(const SharedTls& tls, const std::string& bytes) {
  return RawStep("SendMadeByteByByte()", [=](PeerConnection& peer, std::string*) {
    SSL_write(tls->Ssl(), bytes.data(), static_cast<int>(bytes.size()));
    for (const char byte : tls->TakeOutput()) {
      if (!peer.SendRaw(std::string(1, byte))) return false;
    }
    return true;
  });
}

// What `count` new keys or tickets send.
std::string Renewals(ServerTls& tls, int count, int (*renew)(SSL*)) {
  std::string records;
  for (int i = 0; i < count; ++i) {
    EXPECT_EQ(renew(tls.Ssl()), 1);
    SSL_do_handshake(tls.Ssl());
    records += tls.TakeOutput();
  }
  return records;
}

int NewKey(SSL* ssl) {
  return SSL_key_update(ssl, SSL_KEY_UPDATE_NOT_REQUESTED);
}
int NewKeys(SSL* ssl) {
  return SSL_key_update(ssl, SSL_KEY_UPDATE_REQUESTED);
}

TrafficCase Renews(const std::string& name, int count, int (*renew)(SSL*)) {
  return Serves(
      name, TLS1_3_VERSION,
      [=](const SharedTls& tls) {
        const auto make = [=](ServerTls& server) { return Renewals(server, count, renew); };
        return Script{SendMade(tls, make), SendTls(tls, kResponse)};
      },
      kWhole);
}

// Asks for a second handshake and makes it.
Step Renegotiate(const SharedTls& tls) {
  return RawStep("Renegotiate()", [tls](PeerConnection& peer, std::string* error) {
    SSL_renegotiate(tls->Ssl());
    SSL_do_handshake(tls->Ssl());
    if (!peer.SendRaw(tls->TakeOutput())) return false;
    char none;
    while (SSL_renegotiate_pending(tls->Ssl()) == 1 || SSL_is_init_finished(tls->Ssl()) != 1) {
      if (!tls->Feed(peer, error)) return false;
      SSL_read(tls->Ssl(), &none, 0);
      SSL_peek(tls->Ssl(), &none, 1);
      if (!peer.SendRaw(tls->TakeOutput())) return false;
    }
    return true;
  });
}

std::vector<TrafficCase> ProtocolTable() {
  return {
      Serves(
          "Tls12RecordByteByByte", TLS1_2_VERSION,
          [](const SharedTls& tls) { return Script{SendMadeByteByByte(tls, kResponse)}; }, kWhole),
      Serves(
          "Tls13RecordByteByByte", TLS1_3_VERSION,
          [](const SharedTls& tls) { return Script{SendMadeByteByByte(tls, kResponse)}; }, kWhole),
      Serves(
          "Tls13FullRecordByteByByte", TLS1_3_VERSION,
          [](const SharedTls& tls) {
            return Script{SendTls(tls, kHead), SendMadeByteByByte(tls, std::string(16384, 'b'))};
          },
          Success(std::string(16384, 'b'))),
      Renews("ANewKey", 1, NewKey),
      Renews("TenThousandNewKeys", 10000, NewKey),
      Renews("NewKeysOfBothSides", 1, NewKeys),
      Renews("AThousandNewKeysOfBothSides", 1000, NewKeys),
      Renews("AThousandTickets", 1000, SSL_new_session_ticket),
      Serves(
          "ASecondHandshake", TLS1_2_VERSION,
          [](const SharedTls& tls) {
            return Script{Renegotiate(tls), SendTls(tls, kResponse)};
          },
          kWhole),
      Serves(
          "ASecondHandshakeInTheBody", TLS1_2_VERSION,
          [](const SharedTls& tls) {
            return Script{SendTls(tls, kHead + "bo"), Renegotiate(tls), SendTls(tls, "dy")};
          },
          kWhole),
  };
}

// Sends `bytes` and a close notice.
TrafficCase Ends(const std::string& name, const std::string& bytes, const Outcome& expected) {
  const auto response = [bytes](const SharedTls& tls) {
    return Script{SendTls(tls, bytes), SendTlsCloseNotice(tls)};
  };
  return Serves(name, TLS1_3_VERSION, response, expected);
}

// The ends of a connection. An end is an end, with a close notice and without, also inside a
// record.
const std::vector<TrafficCase> kEnds = {
    Serves(
        "WithoutAWord", TLS1_3_VERSION, [](const SharedTls&) { return Script{}; }, kUnread),
    Serves(
        "WithANoticeAlone", TLS1_3_VERSION,
        [](const SharedTls& tls) { return Script{SendTlsCloseNotice(tls)}; }, kUnread),
    Ends("WithANoticeInTheStatusLine", "HTTP/1.0 200 O", kNoBody),
    Ends("WithANoticeInAHeader", "HTTP/1.0 200 OK\r\nX: ", kNoBody),
    Ends("WithANoticeAfterACarriageReturn", "HTTP/1.0 200 OK\r", kUnread),
    Ends("WithANoticeAfterTheHead", kHead, kNoBody),
    Ends("WithANoticeInTheBody", kHead + "bo", Success("bo")),
    Serves(
        "WithoutANoticeInTheBody", TLS1_3_VERSION,
        [](const SharedTls& tls) { return Script{SendTls(tls, kHead + "bo")}; }, Success("bo")),
    ServesRecords(
        "WithinARecord",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), Data(tls, "body").substr(0, 20)});
        },
        kNoBody),
    ServesRecords(
        "WithinARecordsHeader",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), "\x17\x03"});
        },
        kNoBody),
    ServesRecords(
        "WithDataAfterTheNotice",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kResponse), tls.Encrypted(kAlertRecord, std::string("\1\0", 2)),
                          Data(tls, "more")});
        },
        kWhole),
    ServesRecords(
        "WithTenThousandNotices",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kResponse), Alerts(tls, 10000, std::string("\1\0", 2))});
        },
        kWhole),
    {"WithANoticeAndAnOpenConnection",
     [] {
       const SharedTls tls = Tls13();
       return Script{FinishHandshake(tls), ExpectTlsRequest(tls), SendTls(tls, kResponse),
                     SendTlsCloseNotice(tls), DiscardUntilEnd()};
     },
     kWhole,
     {}},
    {"WithAResetAfterTheRequest",
     [] {
       const SharedTls tls = Tls13();
       return Script{FinishHandshake(tls), ExpectTlsRequest(tls), Reset()};
     },
     kUnread,
     {ReadFailure(kSystem)}},
    {"WithSilenceInARecordOfTheBody",
     [] {
       const SharedTls tls = Tls12();
       const auto half = [](ServerTls& server) {
         return InOrder(
             {Data(server, kHead), Data(server, std::string(2000, 'b')).substr(0, 1000)});
       };
       return Script{FinishHandshake(tls), ExpectTlsRequest(tls), SendMade(tls, half),
                     DiscardUntilEnd()};
     },
     kBodyUnread,
     {"error _Read: Select read op error.\n"},
     1},
};

class TlsTraffic : public ::testing::TestWithParam<TrafficCase> {};

}  // namespace

TEST_P(TlsTraffic, EndsAsTheTableSays) {
  const TrafficCase& test = GetParam();
  const DescriptorGuard descriptors;
  const LogCapture log(3);
  ScriptedPeer peer({test.peer()});
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] { outcome = GetOverTls(peer.Port(), test.timeout); });
  EXPECT_EQ(outcome, test.expected);
  EXPECT_EQ(TlsLines(log), test.log);
}

INSTANTIATE_TEST_SUITE_P(OfOddRecords, TlsTraffic, ::testing::ValuesIn(kRecords),
                         NameOf<TrafficCase>);
INSTANTIATE_TEST_SUITE_P(OfOddProtocols, TlsTraffic, ::testing::ValuesIn(ProtocolTable()),
                         NameOf<TrafficCase>);
INSTANTIATE_TEST_SUITE_P(ThatEnds, TlsTraffic, ::testing::ValuesIn(kEnds), NameOf<TrafficCase>);
