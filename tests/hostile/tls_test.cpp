// TLS servers that stall, break off, lie, or never were TLS servers.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/ssl.h>
#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/net/sslsocket.h"
#include "tests/hostile/hostile_util.h"
#include "tests/hostile/server_tls.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

SharedTls Tls12() {
  return std::make_shared<ServerTls>(TLS1_2_VERSION);
}
SharedTls Tls13() {
  return std::make_shared<ServerTls>(TLS1_3_VERSION);
}
SharedTls TlsOf(int version) {
  return std::make_shared<ServerTls>(version);
}

Script Joined(Script script, const Script& more) {
  script.insert(script.end(), more.begin(), more.end());
  return script;
}

// Ends the stream and waits for the client's end, so that nothing arrives on a closed connection.
Script EndOfStream() {
  return {ShutdownWrite(), DiscardUntilEnd()};
}

// The lines of the TLS socket, without OpenSSL's text.
std::vector<std::string> TlsLines(const LogCapture& log) {
  std::vector<std::string> lines;
  for (const LogLine& line : log.Lines("socket")) {
    if (line.source != "sslsocket") continue;
    const size_t text = line.message.find("] [");
    const std::string message =
        text == std::string::npos ? line.message : line.message.substr(0, text + 1);
    lines.push_back(line.level + " " + line.function + ": " + message);
  }
  return lines;
}

// The line of a failed handshake with an error of SSL_get_error.
std::string FailedWith(int error) {
  return "error Connect: Failed to established SSL conn. with error [" + std::to_string(error) +
         "]";
}

constexpr int kProtocol = SSL_ERROR_SSL;
constexpr int kEnd = SSL_ERROR_ZERO_RETURN;
constexpr int kSystem = SSL_ERROR_SYSCALL;
constexpr int kNoError = SSL_ERROR_NONE;

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

// The ways in which a peer gives up behind a number of its records.
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
       [](const SharedTls& tls) { return Joined({SendHalfARecord(tls)}, EndOfStream()); }, kEnd},
      {"SaysGarbage",
       [](const SharedTls&) { return Joined({SendRaw("not a record")}, EndOfStream()); },
       kProtocol},
      {"SaysAnAlert",
       [](const SharedTls&) {
         return Joined({SendRaw(RawRecord(kAlertRecord, {2, 40}))}, EndOfStream());
       },
       kProtocol},
      {"SaysAnOversizedRecord",
       [](const SharedTls&) {
         return Joined({SendRaw("\x16\x03\x03\xff\xff" + std::string(65535, 'x'))}, EndOfStream());
       },
       kProtocol},
  };
  return endings;
}

// Every ending behind every record that the client waits for.
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
          return Joined({AwaitHello(tls), SendRecords(tls, sent)}, steps(tls));
        };
        table.push_back(
            {std::string(protocol.name) + ending.name + "Behind" + std::to_string(sent) + "Records",
             peer, ending.error});
      }
    }
  }
  return table;
}

HandshakeCase Says(const std::string& name, const std::string& bytes, int error = kProtocol) {
  return {name, [bytes] { return Joined({SendRaw(bytes)}, EndOfStream()); }, error};
}

std::string HandshakeMessage(int type, size_t announced, const std::string& content) {
  return {std::string({static_cast<char>(type), static_cast<char>(announced >> 16),
                       static_cast<char>(announced >> 8), static_cast<char>(announced)}) +
          content};
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
       return Joined({echo}, EndOfStream());
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
        return Joined({SendFlightWith(Tls12(), record, change)}, EndOfStream());
      };
      const auto peer13 = [record, change = change] {
        return Joined({SendFlightWith(Tls13(), record + 2, change)}, EndOfStream());
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
          // Behind the handshake come tickets, which the client need not wait for.
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
                           return Joined(before, rest);
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
      sound("Tls12BehindAWarning", TLS1_2_VERSION, {SendRaw(kWarning)}),
      sound("Tls12BehindAnEmptyRecord", TLS1_2_VERSION, {SendRaw(RawRecord(kHandshakeRecord, ""))}),
      sound("Tls12Behind10000HelloRequests", TLS1_2_VERSION,
            {SendRaw(Repeated(10000, kHelloRequest))}),
  };
}

// Stalls.

struct StallCase {
  std::string name;
  int version;
  size_t records;  // that come before it
  bool within_record;
  bool resumes;
  std::chrono::milliseconds length{30};
};

std::ostream& operator<<(std::ostream& out, const StallCase& test) {
  return out << test.name;
}

std::vector<StallCase> StallTable() {
  std::vector<StallCase> table;
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    const std::string protocol = version == TLS1_2_VERSION ? "Tls12" : "Tls13";
    const size_t records = version == TLS1_2_VERSION ? 7 : 6;
    for (size_t sent = 0; sent < records; ++sent) {
      const std::string name = protocol + "Behind" + std::to_string(sent) + "Records";
      table.push_back({name + "ThenEnds", version, sent, false, false});
      table.push_back({name + "ThenGoesOn", version, sent, false, true});
      table.push_back({name + "AndAHalfThenEnds", version, sent, true, false});
      table.push_back({name + "AndAHalfThenGoesOn", version, sent, true, true});
    }
  }
  // The handshake has no time limit: these stalls are longer than the socket's.
  const std::chrono::milliseconds longer(1200);
  table.push_back({"LongerThanTheTimeLimitBeforeTheHello", TLS1_3_VERSION, 0, false, true, longer});
  table.push_back({"LongerThanTheTimeLimitBehindTheHello", TLS1_2_VERSION, 1, false, true, longer});
  table.push_back({"LongerThanTheTimeLimitInARecord", TLS1_3_VERSION, 3, true, false, longer});
  return table;
}

Script StallingPeer(const StallCase& test, const Flag& stalled, const Flag& go_on) {
  const SharedTls tls = TlsOf(test.version);
  Script script = {SendRecords(tls, test.records)};
  if (test.within_record) script.push_back(SendHalfARecord(tls));
  script.push_back(SetFlag(stalled));
  script.push_back(WaitFor(go_on));
  if (test.resumes) script.push_back(FinishHandshake(tls));
  return Joined(script, EndOfStream());
}

const StallCase kLibcurlStalls[] = {
    {"BeforeTheHello", TLS1_3_VERSION, 0, false, false},
    {"BehindTheHello", TLS1_2_VERSION, 1, false, false},
    {"InARecord", TLS1_3_VERSION, 3, true, false},
};

Script StallUntilTheClientGoes(const StallCase& test) {
  const SharedTls tls = TlsOf(test.version);
  Script script = {SendRecords(tls, test.records)};
  if (test.within_record) script.push_back(SendHalfARecord(tls));
  script.push_back(DiscardUntilEnd());
  return script;
}

// Behind the handshake.

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
const std::string kReply = kHead + "body";
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
  ClientProbe client(port, settings);
  Outcome outcome = OutcomeOf(client, client.SendRequestByGet());
  char piece[4096];
  int count = -1;
  while ((count = client.ReadData(piece, sizeof(piece))) > 0) {
    outcome.text.append(piece, static_cast<size_t>(count));
  }
  if (count < 0) outcome.text += "|";
  return outcome;
}

// Serves a request by `reply`, then ends the stream.
TrafficCase Serves(const std::string& name, int version,
                   const std::function<Script(const SharedTls&)>& reply, const Outcome& expected,
                   const std::vector<std::string>& log = {}) {
  const auto peer = [version, reply] {
    const SharedTls tls = TlsOf(version);
    const Script begin = {FinishHandshake(tls), ExpectTlsRequest(tls)};
    return Joined(Joined(begin, reply(tls)), EndOfStream());
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

std::string Data(ServerTls& tls, const std::string& bytes) {
  return tls.Encrypted(kDataRecord, bytes);
}

// Records have numbers: a list makes them in its order.
std::string InOrder(std::initializer_list<std::string> records) {
  std::string all;
  for (const std::string& record : records) all += record;
  return all;
}

std::string EmptyRecords(ServerTls& tls, int count) {
  std::string records;
  for (int i = 0; i < count; ++i) records += Data(tls, "");
  return records;
}

std::string Alerts(ServerTls& tls, int count, const std::string& alert) {
  std::string records;
  for (int i = 0; i < count; ++i) records += tls.Encrypted(kAlertRecord, alert);
  return records;
}

// More than 10,000 empty records between the bytes of a reply.
std::string ReplyAmongEmptyRecords(ServerTls& tls) {
  std::string records;
  for (const char byte : kHead + std::string(400, 'b')) {
    records += InOrder({EmptyRecords(tls, 30), Data(tls, std::string(1, byte))});
  }
  return records;
}

const std::string kNoRenegotiation = {1, 90};  // a warning
const std::vector<std::string> kFailed = {ReadFailure(kProtocol)};

// A fatal alert reads as the end of the stream: OpenSSL gives 0 for it.
const std::vector<TrafficCase> kRecords = {
    ServesRecords(
        "OneRecord", [](ServerTls& tls) { return Data(tls, kReply); }, kWhole),
    ServesRecords(
        "ARecordAByte",
        [](ServerTls& tls) {
          std::string records;
          for (const char byte : kReply) records += Data(tls, std::string(1, byte));
          return records;
        },
        kWhole),
    ServesRecords(
        "TenThousandEmptyRecords",
        [](ServerTls& tls) {
          return InOrder({EmptyRecords(tls, 10000), Data(tls, kReply)});
        },
        kUnread, kFailed),
    ServesRecords(
        "TenThousandEmptyRecordsBehindTheHead",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), EmptyRecords(tls, 10000)});
        },
        kBodyUnread, kFailed),
    ServesRecords("TwelveThousandEmptyRecordsAmongTheBytes", ReplyAmongEmptyRecords,
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
          return InOrder({Data(tls, kHead), "\x17\x03\x03\xff\xff", kReply});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "ARecordOfNoKey",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kHead), RawRecord(kDataRecord, kReply)});
        },
        kBodyUnread, kFailed),
    ServesRecords(
        "PlainText", [](ServerTls&) { return kReply; }, kUnread, kFailed),
    ServesRecords("ARecordThatCameBefore",
                  [](ServerTls& tls) {
                    const std::string record = Data(tls, kReply);
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
          return InOrder({tls.Encrypted(24, {1, 64, 0}), Data(tls, kReply)});
        },
        kUnread, kFailed),
    ServesRecords(
        "ThreeWarnings",
        [](ServerTls& tls) {
          return InOrder({Alerts(tls, 3, kNoRenegotiation), Data(tls, kReply)});
        },
        kWhole),
    ServesRecords(
        "TenThousandWarnings",
        [](ServerTls& tls) {
          return InOrder({Alerts(tls, 10000, kNoRenegotiation), Data(tls, kReply)});
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
                          Data(tls, kReply)});
        },
        kUnread, kFailed),
};

// Sends what `make` gives, one raw byte at a time.
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
        return Script{SendMade(tls, make), SendTls(tls, kReply)};
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
          [](const SharedTls& tls) { return Script{SendMadeByteByByte(tls, kReply)}; }, kWhole),
      Serves(
          "Tls13RecordByteByByte", TLS1_3_VERSION,
          [](const SharedTls& tls) { return Script{SendMadeByteByByte(tls, kReply)}; }, kWhole),
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
            return Script{Renegotiate(tls), SendTls(tls, kReply)};
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
  const auto reply = [bytes](const SharedTls& tls) {
    return Script{SendTls(tls, bytes), SendTlsCloseNotice(tls)};
  };
  return Serves(name, TLS1_3_VERSION, reply, expected);
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
    Ends("WithANoticeBehindACarriageReturn", "HTTP/1.0 200 OK\r", kUnread),
    Ends("WithANoticeBehindTheHead", kHead, kNoBody),
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
        "WithDataBehindTheNotice",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kReply), tls.Encrypted(kAlertRecord, std::string("\1\0", 2)),
                          Data(tls, "more")});
        },
        kWhole),
    ServesRecords(
        "WithTenThousandNotices",
        [](ServerTls& tls) {
          return InOrder({Data(tls, kReply), Alerts(tls, 10000, std::string("\1\0", 2))});
        },
        kWhole),
    {"WithANoticeAndAnOpenConnection",
     [] {
       const SharedTls tls = Tls13();
       return Script{FinishHandshake(tls), ExpectTlsRequest(tls), SendTls(tls, kReply),
                     SendTlsCloseNotice(tls), DiscardUntilEnd()};
     },
     kWhole,
     {}},
    {"WithAResetBehindTheRequest",
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

class TlsHandshakes : public ::testing::TestWithParam<HandshakeCase> {};
class TlsHandshakesOfLibcurl : public ::testing::TestWithParam<HandshakeCase> {};
class TlsStalls : public ::testing::TestWithParam<StallCase> {};
class TlsStallsOfLibcurl : public ::testing::TestWithParam<StallCase> {};
class TlsTraffic : public ::testing::TestWithParam<TrafficCase> {};

template <typename Case>
std::string NameOf(const ::testing::TestParamInfo<Case>& info) {
  return info.param.name;
}

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
    ClientProbe client(peer.Port(), settings);
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

TEST_P(TlsStalls, LastAsLongAsThePeerIsSilent) {
  const StallCase& test = GetParam();
  const Flag stalled, go_on;
  auto peer =
      std::make_unique<ScriptedPeer>(std::vector<Script>{StallingPeer(test, stalled, go_on)});
  const int port = peer->Port();
  std::atomic<bool> returned{false};
  std::thread client([&] {
    RunOnSmallStack(kSmallStack, [&] {
      const auto socket = std::make_unique<SSLSocket>("127.0.0.1", port, 1, true);
      EXPECT_EQ(socket->Connect(), test.resumes ? 0 : -1);
      returned = true;
    });
  });
  EXPECT_TRUE(stalled.Wait());
  std::this_thread::sleep_for(test.length);
  EXPECT_FALSE(returned);
  go_on.Set();
  peer.reset();  // ends the connection, also when its script has failed
  client.join();
}

INSTANTIATE_TEST_SUITE_P(Hostile, TlsStalls, ::testing::ValuesIn(StallTable()), NameOf<StallCase>);

// libcurl counts the handshake into the transfer's time limit.
TEST_P(TlsStallsOfLibcurl, EndWithTheTimeLimit) {
  const LogCapture log(5);
  ScriptedPeer peer({StallUntilTheClientGoes(GetParam())});
  RunOnSmallStack(kSmallStack, [&] {
    ClientSettings settings;
    settings.https = true;
    ClientProbe client(peer.Port(), settings);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 1), HTTP_RET_IO_ERROR);
  });
  EXPECT_THAT(HttpLog(log),
              ElementsAre("SendRequestByCurl: Failed to make http connection, return value=28\n"));
}

INSTANTIATE_TEST_SUITE_P(Hostile, TlsStallsOfLibcurl, ::testing::ValuesIn(kLibcurlStalls),
                         NameOf<StallCase>);

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
