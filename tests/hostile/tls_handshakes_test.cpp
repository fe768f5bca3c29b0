// TLS handshakes that break off, lie, or never were any.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <string>
#include <vector>

#include "tarnwick/net/sslsocket.h"
#include "tests/hostile/hostile_util.h"
#include "tests/hostile/server_tls.h"
#include "tests/hostile/tls_cases.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

// The line of a failed handshake with an error of SSL_get_error.
std::string FailedWith(int error) {
  return "error Connect: Failed to established SSL conn. with error [" + std::to_string(error) +
         "]";
}

// Handshakes.

struct HandshakeCase {
  std::string name;
  std::function<Script()> peer;
  int error;  // of SSL_get_error; kNoError: the handshake succeeds
};

std::ostream& operator<<(std::ostream& out, const HandshakeCase& test) {
  return out << test.name;
}

void ExpectHandshake(const HandshakeCase& test) {
  const DescriptorGuard descriptors;
  const LogCapture log(3);
  const bool succeeds = test.error == kNoError;
  ScriptedPeer peer({test.peer()});
  RunOnSmallStack(kSmallStack, [&] {
    const auto socket = std::make_unique<SSLSocket>("127.0.0.1", peer.Port(), 5, true);
    EXPECT_EQ(socket->Connect(), succeeds ? 0 : -1);
    EXPECT_EQ(socket->IsConnected(), succeeds);
  });
  peer.Finish();
  if (succeeds) {
    EXPECT_THAT(TlsLines(log), IsEmpty());
  } else {
    EXPECT_THAT(TlsLines(log), ElementsAre(FailedWith(test.error)));
  }
}

// The ways in which a peer gives up after a number of its records.
struct Ending {
  const char* name;
  std::function<Script(const SharedTls&)> steps;
  int error;
};

const std::vector<Ending>& Endings() {
  static const std::vector<Ending> endings = {
      {"Ends", [](const SharedTls&) { return EndOfStream(); }, kEnd},
      {"Resets", [](const SharedTls&) { return Script{Reset()}; }, kSystem},
      {"EndsWithinARecord",
       [](const SharedTls& tls) { return Concat({SendHalfARecord(tls)}, EndOfStream()); }, kEnd},
      {"SaysGarbage",
       [](const SharedTls&) { return Concat({SendRaw("not a record")}, EndOfStream()); },
       kProtocol},
      {"SaysAnAlert",
       [](const SharedTls&) {
         return Concat({SendRaw(RawRecord(kAlertRecord, {2, 40}))}, EndOfStream());
       },
       kProtocol},
      {"SaysAnOversizedRecord",
       [](const SharedTls&) {
         return Concat({SendRaw("\x16\x03\x03\xff\xff" + std::string(65535, 'x'))}, EndOfStream());
       },
       kProtocol},
  };
  return endings;
}

// Every ending after every record that the client waits for.
std::vector<HandshakeCase> StageTable() {
  std::vector<HandshakeCase> table;
  const struct {
    const char* name;
    int version;
    size_t records;
  } kProtocols[] = {{"Tls12", TLS1_2_VERSION, 7}, {"Tls13", TLS1_3_VERSION, 6}};
  for (const auto& protocol : kProtocols) {
    for (size_t sent = 0; sent < protocol.records; ++sent) {
      for (const Ending& ending : Endings()) {
        const auto peer = [version = protocol.version, sent, steps = ending.steps] {
          const SharedTls tls = TlsOf(version);
          return Concat({AwaitHello(tls), SendRecords(tls, sent)}, steps(tls));
        };
        table.push_back(
            {std::string(protocol.name) + ending.name + "After" + std::to_string(sent) + "Records",
             peer, ending.error});
      }
    }
  }
  return table;
}

HandshakeCase Says(const std::string& name, const std::string& bytes, int error = kProtocol) {
  return {name, [bytes] { return Concat({SendRaw(bytes)}, EndOfStream()); }, error};
}

std::string ServerHello(const std::string& content) {
  return RawRecord(kHandshakeRecord, HandshakeMessage(2, content.size(), content));
}

const std::string kHelloRequest = RawRecord(kHandshakeRecord, std::string(4, '\0'));
const std::string kChangeCipher = RawRecord(kChangeCipherRecord, "\x01");
const std::string kWarning = RawRecord(kAlertRecord, {1, 112});

// Servers that send the same whatever the client says.
const std::vector<HandshakeCase> kGarbage = {
    Says("Nothing", "", kEnd),
    Says("PlainHttp", "HTTP/1.1 200 OK\r\nContent-Length: 2\r\n\r\nok"),
    Says("PlainHttpThatRefuses", "HTTP/1.1 400 The plain request was sent to HTTPS port\r\n\r\n"),
    Says("Html", "<html><body>400</body></html>"),
    Says("SshBanner", "SSH-2.0-OpenSSH_9.2\r\n"),
    Says("MailBanner", "220 mail ESMTP ready\r\n"),
    Says("OneByte", "\x16", kEnd),
    Says("FourBytesOfARecord", "\x16\x03\x03\x01", kEnd),
    Says("AHeaderWithoutItsRecord", "\x16\x03\x03\x01\x01", kEnd),
    Says("64KBOfZeros", std::string(65536, '\0')),
    Says("64KBOfOnes", std::string(65536, '\xff')),
    Says("64KBOfText", std::string(65536, 'A')),
    Says("AnOldHello", std::string("\x80\x2e\x04\x00\x01\x00\x02", 7) + std::string(40, 'x')),
    Says("ARecordOf65535Bytes", "\x16\x03\x03\xff\xff" + std::string(65535, '\0')),
    Says("ARecordOf16385Bytes", RawRecord(kHandshakeRecord, std::string(16385, '\x02'))),
    Says("AnEmptyRecord", RawRecord(kHandshakeRecord, ""), kEnd),
    Says("TenThousandEmptyRecords", Repeated(10000, RawRecord(kHandshakeRecord, ""))),
    Says("TenThousandEmptyAlerts", Repeated(10000, RawRecord(kAlertRecord, ""))),
    Says("TenThousandChangesOfTheCipher", Repeated(10000, kChangeCipher)),
    Says("TenThousandHelloRequests", Repeated(10000, kHelloRequest), kEnd),
    Says("DataBeforeTheHandshake", RawRecord(kDataRecord, "HTTP/1.1 200 OK\r\n\r\n")),
    Says("AHeartbeat", RawRecord(24, {1, 64, 0})),
    Says("AnUnknownRecord", RawRecord(99, "x")),
    Says("ProtocolVersion0", RawRecord(kHandshakeRecord, "x", 0)),
    Says("ProtocolVersion9", RawRecord(kHandshakeRecord, "x", 0x0909)),
    Says("AnAlert", RawRecord(kAlertRecord, {2, 40})),
    Says("AnUnknownAlert", RawRecord(kAlertRecord, {2, 0x7f})),
    Says("AnAlertOfAnUnknownLevel", RawRecord(kAlertRecord, {9, 40})),
    Says("AnAlertOfOneByte", RawRecord(kAlertRecord, "\x02")),
    Says("AnAlertOf100Bytes", RawRecord(kAlertRecord, std::string(100, '\x02'))),
    Says("AWarning", kWarning, kEnd),
    Says("TenThousandWarnings", Repeated(10000, kWarning)),
    Says("ACloseNotice", RawRecord(kAlertRecord, std::string("\x01\x00", 2)), kEnd),
    Says("AHelloOf16MB",
         RawRecord(kHandshakeRecord, HandshakeMessage(2, 0xffffff, std::string(16000, 'x')))),
    Says("AnEmptyHello", ServerHello("")),
    Says("AHelloOfText", ServerHello(std::string(100, 'x'))),
    Says("AHelloOfZeros", ServerHello(std::string(100, '\0'))),
    Says("AHelloOfAnOldProtocol",
         ServerHello("\x03" + std::string(1, '\0') + std::string(32, 'r') +
                     std::string("\0\0\x35\0", 4))),
    Says("AHelloWithAnUnknownCipher",
         ServerHello("\x03\x03" + std::string(32, 'r') + std::string("\0\xfe\xfe\0", 4))),
    Says("AMessageOfAnUnknownType", RawRecord(kHandshakeRecord, HandshakeMessage(77, 4, "abcd"))),
    Says("TheEndBeforeTheBeginning",
         RawRecord(kHandshakeRecord, HandshakeMessage(20, 12, std::string(12, 'f')))),
    {"ItsOwnWords",
     [] {
       const Step echo = RawStep("Echo", [](PeerConnection& peer, std::string*) {
         std::string bytes;
         return peer.ReadRaw(&bytes) == PeerConnection::Read::kData && peer.SendRaw(bytes);
       });
       return Concat({echo}, EndOfStream());
     },
     kProtocol},
};

// The server's first flight with one record changed.
using Change = std::string (*)(const std::string& record);

Step SendFlightWith(const SharedTls& tls, size_t changed, Change change) {
  return RawStep("SendFlightWith()", [=](PeerConnection& peer, std::string* error) {
    while (tls->MakeRecords() == 0 && tls->Queue().empty()) {
      if (!tls->Feed(peer, error)) return false;
    }
    for (size_t i = 0; i < tls->Queue().size(); ++i) {
      const std::string& record = tls->Queue()[i];
      if (!peer.SendRaw(i == changed ? change(record) : record)) break;  // the client has gone
    }
    return changed < tls->Queue().size();
  });
}

std::string Filled(const std::string& record, char with) {
  return record.substr(0, 5) + std::string(record.size() - 5, with);
}

std::vector<HandshakeCase> ChangeTable() {
  const struct {
    const char* name;
    Change change;
  } kChanges[] = {
      {"Missing", [](const std::string&) { return std::string(); }},
      {"OfZeros", [](const std::string& record) { return Filled(record, '\0'); }},
      {"OfOnes", [](const std::string& record) { return Filled(record, '\xff'); }},
      {"WithAnotherLastByte",
       [](const std::string& record) {
         std::string changed = record;
         changed.back() = static_cast<char>(changed.back() ^ 1);
         return changed;
       }},
      {"InsideAnother",
       [](const std::string& record) { return RawRecord(kHandshakeRecord, record); }},
  };
  std::vector<HandshakeCase> table;
  for (const auto& [name, change] : kChanges) {
    for (const size_t record : {0, 1, 2}) {
      const auto peer12 = [record, change = change] {
        return Concat({SendFlightWith(Tls12(), record, change)}, EndOfStream());
      };
      const auto peer13 = [record, change = change] {
        return Concat({SendFlightWith(Tls13(), record + 2, change)}, EndOfStream());
      };
      const std::string name12 = "Tls12Record" + std::to_string(record) + name;
      // Nobody checks the signature of the certificate.
      const bool passes = name12 == "Tls12Record1WithAnotherLastByte";
      table.push_back({name12, peer12, passes ? kEnd : kProtocol});
      table.push_back({"Tls13Record" + std::to_string(record + 2) + name, peer13, kProtocol});
    }
  }
  return table;
}

Step SendHandshakeByteByByte(const SharedTls& tls) {
  return RawStep("SendHandshakeByteByByte()", [tls](PeerConnection& peer, std::string* error) {
    for (int made = 0; made == 0;) {
      made = tls->MakeRecords();
      for (const std::string& record : tls->Queue()) {
        for (const char byte : record) {
          // After the handshake come tickets, which the client need not wait for.
          if (!peer.SendRaw(std::string(1, byte))) return made == 1;
        }
      }
      tls->Queue().clear();
      if (made == 0 && !tls->Feed(peer, error)) return false;
    }
    return true;
  });
}

// Odd, and still a handshake.
std::vector<HandshakeCase> SoundTable() {
  const auto sound = [](const char* name, int version, const Script& before) {
    return HandshakeCase{name,
                         [=] {
                           const Script rest = {FinishHandshake(TlsOf(version)), DiscardUntilEnd()};
                           return Concat(before, rest);
                         },
                         kNoError};
  };
  const auto slow = [](const char* name, int version) {
    return HandshakeCase{
        name,
        [=] {
          return Script{SendHandshakeByteByByte(TlsOf(version)), DiscardUntilEnd()};
        },
        kNoError};
  };
  return {
      sound("Tls12", TLS1_2_VERSION, {}),
      sound("Tls13", TLS1_3_VERSION, {}),
      slow("Tls12ByteByByte", TLS1_2_VERSION),
      slow("Tls13ByteByByte", TLS1_3_VERSION),
      sound("Tls12AfterAWarning", TLS1_2_VERSION, {SendRaw(kWarning)}),
      sound("Tls12AfterAnEmptyRecord", TLS1_2_VERSION, {SendRaw(RawRecord(kHandshakeRecord, ""))}),
      sound("Tls12After10000HelloRequests", TLS1_2_VERSION,
            {SendRaw(Repeated(10000, kHelloRequest))}),
  };
}

class TlsHandshakes : public ::testing::TestWithParam<HandshakeCase> {};

class TlsHandshakesOfLibcurl : public ::testing::TestWithParam<HandshakeCase> {};

}  // namespace

TEST_P(TlsHandshakes, EndAsTheTableSays) {
  ExpectHandshake(GetParam());
}

INSTANTIATE_TEST_SUITE_P(BrokenOff, TlsHandshakes, ::testing::ValuesIn(StageTable()),
                         NameOf<HandshakeCase>);
INSTANTIATE_TEST_SUITE_P(OfGarbage, TlsHandshakes, ::testing::ValuesIn(kGarbage),
                         NameOf<HandshakeCase>);
INSTANTIATE_TEST_SUITE_P(WithAChangedRecord, TlsHandshakes, ::testing::ValuesIn(ChangeTable()),
                         NameOf<HandshakeCase>);
INSTANTIATE_TEST_SUITE_P(ThatSucceed, TlsHandshakes, ::testing::ValuesIn(SoundTable()),
                         NameOf<HandshakeCase>);

TEST_P(TlsHandshakesOfLibcurl, FailTheRequest) {
  const LogCapture log(5);
  ScriptedPeer peer({GetParam().peer()});
  RunOnSmallStack(kSmallStack, [&] {
    ClientSettings settings;
    settings.https = true;
    ExposedClient client(peer.Port(), settings);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 5), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_strCurlText, "");
  });
  EXPECT_THAT(
      HttpLog(log),
      ElementsAre(StartsWith("SendRequestByCurl: Failed to make http connection, return value=")));
}

INSTANTIATE_TEST_SUITE_P(OfGarbage, TlsHandshakesOfLibcurl, ::testing::ValuesIn(kGarbage),
                         NameOf<HandshakeCase>);
