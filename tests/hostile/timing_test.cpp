// Peers that are slow, stop in the middle, or do not read. The scenarios wait most of the time, so
// they are played all at once, each on threads of its own; the tests then look at what came of
// each.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/value.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <chrono>
#include <map>
#include <mutex>
#include <thread>

#include "tests/hostile/hostile_util.h"

using namespace std::string_literals;
using std::chrono::milliseconds;

namespace {

constexpr char kHead[] = "HTTP/1.1 200 OK\r\n\r\n";
constexpr char kChunkedHead[] = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";
constexpr char kSoapHead[] = "HTTP/1.1 200 OK\r\nContent-Length: 10\r\n\r\n";

// Each client waits for a second. A pause is longer than that, and a short one is not; several
// short ones are.
constexpr int kTimeout = 1;
constexpr milliseconds kLong(1500);
constexpr milliseconds kShort(100);

Step Pause(milliseconds time) {
  return {"Pause()", [time](PeerConnection&, std::string*) {
            std::this_thread::sleep_for(time);
            return true;
          }};
}

// Sends byte by byte with a short pause in between, as long as the client takes them.
Step SendSlowly(const std::string& bytes) {
  return {"SendSlowly()", [bytes](PeerConnection& peer, std::string* error) {
            for (const char byte : bytes) {
              if (!peer.Write(std::string(1, byte))) break;
              std::this_thread::sleep_for(kShort);
            }
            if (peer.DeadlinePassed()) *error = "deadline passed";
            return !peer.DeadlinePassed();
          }};
}

Script StallAfter(const std::string& bytes) {
  return {ExpectRequest(), Send(bytes), StallUntilFinish()};
}

Script PauseBetween(const std::string& before, const std::string& after) {
  return {ExpectRequest(), Send(before), Pause(kLong), SendWhileRead(after), Close()};
}

Script Slowly(const std::string& response) {
  return {ExpectRequest(), SendSlowly(response), Close()};
}

ClientSettings Settings(bool buffered, bool https = false) {
  ClientSettings settings;
  settings.timeout = kTimeout;
  settings.buffered = buffered;
  settings.https = https;
  return settings;
}

Outcome GetAndReadBody(int port, const ClientSettings& settings) {
  ExposedClient client(port, settings);
  const int sent = client.SendRequestByGet();
  if (sent != HTTP_RET_OK) return OutcomeOf(client, sent, "not sent");
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, body);
}

Outcome Buffered(int port) {
  return GetAndReadBody(port, Settings(true));
}

Outcome Direct(int port) {
  return GetAndReadBody(port, Settings(false));
}

Outcome DirectOverTls(int port) {
  return GetAndReadBody(port, Settings(false, true));
}

Outcome WithoutATimeout(int port) {
  ClientSettings settings = Settings(true);
  settings.timeout = -1;
  return GetAndReadBody(port, settings);
}

Outcome SoapOf(int port, size_t size) {
  ExposedClient client(port, Settings(true));
  std::string response = "untouched";
  const int result = client.SendReqBySocketPost(std::string(size, 'x'), response);
  return OutcomeOf(client, result, response);
}

Outcome Soap(int port) {
  return SoapOf(port, 1);
}

const std::string kSlowBody(20, 'x');

// More than the buffers of both ends hold.
constexpr size_t kLarge = 16 << 20;

Outcome LargeSoap(int port) {
  return SoapOf(port, kLarge);
}

Outcome LargeForm(int port) {
  ExposedClient client(port, Settings(true));
  const int result = client.SendRequestBySocketPost(std::string(kLarge, 'x'));
  return OutcomeOf(client, result);
}

// The text tells how much of the upload was taken.
Outcome UploadOver(int port, bool https) {
  ExposedClient client(port, Settings(true, https));
  const int result = client.OpenRawDataUpload();
  const std::string data(kLarge, 'x');
  const int written = client.WriteData(data.data(), static_cast<int>(data.size()));
  const bool all = written == static_cast<int>(kLarge);
  return OutcomeOf(client, result, all ? "all" : written < 0 ? "failure" : "a part");
}

Outcome Upload(int port) {
  return UploadOver(port, false);
}

Outcome UploadOverTls(int port) {
  return UploadOver(port, true);
}

Outcome Json(int port) {
  Json::Value value = "untouched";
  const int result = SendHttpGet("127.0.0.1", port, "a.cgi", value, kTimeout, true);
  return OneCall(result, value.toStyledString());
}

Outcome Form(int port) {
  return {SendHttpPost("127.0.0.1", port, "a.cgi", "a=1", "s=1", kTimeout), 0, 0, ""};
}

Outcome Curl(int port) {
  ExposedClient client(port);
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, kTimeout);
  return OutcomeOf(client, result, client.m_strCurlText);
}

// How much of a slow body has come in time is not sure; all of it has not.
Outcome CurlOfASlowBody(int port) {
  Outcome outcome = Curl(port);
  if (!outcome.text.empty() && outcome.text.size() < kSlowBody.size()) outcome.text = "a part";
  return outcome;
}

Outcome CurlPost(int port) {
  ExposedClient client(port);
  return OutcomeOf(client, client.SendRequestByPost("?"));
}

Outcome XmlGet(int port) {
  ExposedClient client(port);
  const int result = client.SendReqByXMLGet(kTimeout);
  return OutcomeOf(client, result, client.m_pRespBuf != nullptr ? client.m_pRespBuf : "");
}

Outcome ToABlackHole(int /*port*/) {
  const BlackHolePort hole;
  return GetAndReadBody(hole.Port(), Settings(true));
}

const char kHeadFailed[] = "CheckContentType: Connect failed!\n\n";
const char kBodyFailed[] = "ReadBody: Read data error\n";

std::string TimedOut(const std::string& function) {
  return function + ": Failed to make http connection, return value=28\n";
}

// Any number of the log stands as N.
const Scenario kTimings[] = {
    // A stall ends the operation, wherever it comes.
    Meets("AStallBeforeTheHead", StallAfter(""), Buffered, NoResponse(), {kBodyFailed}),
    Meets("AStallBeforeTheHeadRead", StallAfter(""), Direct, NoResponse(), {kBodyFailed}),
    Meets("AStallInTheStatusLine", StallAfter("HTTP/1.1 20"), Buffered, NoResponse(),
          {kBodyFailed}),
    Meets("AStallInTheStatusLineRead", StallAfter("HTTP/1.1 20"), Direct, NoResponse(),
          {kBodyFailed}),
    Meets("AStallInAHeaderLine", StallAfter("HTTP/1.1 200 OK\r\nX: "), Buffered,
          {HTTP_RET_IO_ERROR, HTTP_RET_IO_ERROR, 200, ""}, {kHeadFailed, kBodyFailed}),
    Meets("AStallInALineEnd", StallAfter("HTTP/1.1 200 OK\r\nX: y\r"), Direct,
          {HTTP_RET_IO_ERROR, HTTP_RET_IO_ERROR, 200, ""}, {kHeadFailed, kBodyFailed}),
    Meets("AStallAfterTheHead", StallAfter(kHead), Buffered, BodyFailed(""), {kBodyFailed}),
    Meets("AStallAfterTheHeadRead", StallAfter(kHead), Direct, BodyFailed(""), {kBodyFailed}),
    Meets("AStallInABody", StallAfter(kHead + "abc"s), Buffered, BodyFailed("abc"), {kBodyFailed}),
    Meets("AStallInABodyRead", StallAfter(kHead + "abc"s), Direct, BodyFailed("abc"),
          {kBodyFailed}),

    // In place of a chunk's size it is taken for the last chunk.
    Meets("AStallBeforeAChunkSize", StallAfter(kChunkedHead), Buffered, Success("")),
    Meets("AStallInAChunkSize", StallAfter(kChunkedHead + "3\r\nabc\r\n5"s), Buffered,
          Success("abc")),
    Meets("AStallInAChunkSizeRead", StallAfter(kChunkedHead + "3\r\nabc\r\n5"s), Direct,
          Success("abc")),
    Meets("AStallInAChunk", StallAfter(kChunkedHead + "5\r\nabc"s), Buffered, BodyFailed("abc"),
          {kBodyFailed}),
    Meets("AStallInAChunkRead", StallAfter(kChunkedHead + "5\r\nabc"s), Direct, BodyFailed("abc"),
          {kBodyFailed}),
    Meets("AStallAfterAChunk", StallAfter(kChunkedHead + "3\r\nabc"s), Direct, Success("abc")),

    // Over TLS.
    Meets("AStallBeforeTheHeadOverTls", StallAfter(""), DirectOverTls, NoResponse(), {kBodyFailed},
          true),
    Meets("AStallInABodyOverTls", StallAfter(kHead + "abc"s), DirectOverTls, BodyFailed("abc"),
          {kBodyFailed}, true),

    // The other readers.
    Meets("AStallBeforeASoapHead", StallAfter(""), Soap, NoResponse("untouched")),
    Meets("AStallBeforeASoapBody", StallAfter(kSoapHead), Soap, BodyFailed("untouched"),
          {"SendReqBySocketPost: Read data faild.\n"}),
    Meets("AStallInASoapBody", StallAfter(kSoapHead + "<a/>"s), Soap, Success("<a/>")),
    Meets("AStallBeforeJson", StallAfter(""), Json, OneCall(-1, "\"untouched\"\n"),
          {"SendHttpGet: Failed to check response[N]: N\n"}),
    Meets("AStallInJson", StallAfter(kHead + "{\"success\":true}"s), Json,
          OneCall(-1, "\"untouched\"\n"), {"SendHttpGet: Failed to read data: N\n"}),
    Meets("AStallAfterAForm", StallAfter(""), Form, OneCall(0, "")),
    Meets("AStallForCurl", StallAfter(""), Curl, NoResponse(), {TimedOut("SendRequestByCurl")}),
    Meets("AStallInABodyForCurl", StallAfter(kSoapHead + "abc"s), Curl, NoResponse("abc"),
          {TimedOut("SendRequestByCurl")}),
    Meets("AStallInABodyForXml", StallAfter(kSoapHead + "<a>"s), XmlGet, NoResponse("<a>"),
          {TimedOut("SendReqByXMLGet")}),
    Meets("NoAnswerToAConnect", {}, ToABlackHole,
          {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 0, "not sent"},
          {"SendRequestByGet: Connection failed!\n"}),

    // Slow peers, each of whose pauses is within the time-out, are read to their end. libcurl's is
    // one for the whole.
    Meets("ASlowHead", Slowly("HTTP/1.1 200 OK\r\nX: y\r\n\r\n"), Buffered, Success("")),
    Meets("ASlowHeadRead", Slowly("HTTP/1.1 200 OK\r\nX: y\r\n\r\n"), Direct, Success("")),
    Meets("ASlowBody", {ExpectRequest(), Send(kHead), SendSlowly("ten bytes!"), Close()}, Buffered,
          Success("ten bytes!")),
    Meets("ASlowChunk", {ExpectRequest(), Send(kChunkedHead), SendSlowly("3\r\nabc\r\n0"), Close()},
          Buffered, Success("abc")),
    Meets("ASlowBodyOverTls", {ExpectRequest(), Send(kHead), SendSlowly("ten bytes!"), Close()},
          DirectOverTls, Success("ten bytes!"), {}, true),
    Meets("ASlowBodyForCurl", {ExpectRequest(), Send(kHead), SendSlowly(kSlowBody), Close()},
          CurlOfASlowBody, NoResponse("a part"), {TimedOut("SendRequestByCurl")}),

    // A pause beyond the time-out: small reads through the buffer are repeated, others are not.
    Meets("APauseInTheHead", PauseBetween("HTTP/1.1 200 OK\r\n", "\r\nabc"), Buffered,
          Success("abc")),
    Meets("APauseInTheHeadRead", PauseBetween("HTTP/1.1 200 OK\r\n", "\r\nabc"), Direct,
          {HTTP_RET_IO_ERROR, HTTP_RET_IO_ERROR, 200, ""}, {kHeadFailed, kBodyFailed}),
    Meets("APauseBeforeABody", PauseBetween(kHead, "abc"), Buffered, BodyFailed(""), {kBodyFailed}),
    Meets("APauseBeforeAChunkSize", PauseBetween(kChunkedHead, "3\r\nabc\r\n0\r\n\r\n"), Buffered,
          Success("abc")),
    Meets("APauseInAChunk", PauseBetween(kChunkedHead + "4\r\na"s, "bcd\r\n0\r\n\r\n"), Buffered,
          Success("abcd")),
    Meets("APauseInTheSoapBody", PauseBetween(kSoapHead + "<a>"s, "1234</a>"), Soap,
          Success("<a>")),
    Meets("APauseForAClientWithoutATimeout", PauseBetween("HTTP/1.1 200 ", "OK\r\n\r\nabc"),
          WithoutATimeout, Success("abc")),
    Meets("APauseForAnOperationWithoutATimeout",
          {ExpectRequest(), Pause(kLong), Send("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"),
           Close()},
          CurlPost, {HTTP_RET_OK, HTTP_RET_OK, 0, ""}),

    // Peers that do not read. A write waits for as long as it takes.
    Meets("ASoapRequestReadLate",
          {Pause(kLong), ExpectRequest(), Send(kSoapHead + "0123456789"s), Close()}, LargeSoap,
          Success("0123456789")),
    Meets("ASoapRequestNotRead", {ExpectBytes(1), Pause(kLong), Reset()}, LargeSoap,
          NoResponse("untouched")),
    Meets("AFormReadLate", {Pause(kLong), ExpectRequest(), Send(kHead), Close()}, LargeForm,
          Success("")),
    Meets("AFormNotRead", {ExpectBytes(1), Pause(kLong), Reset()}, LargeForm,
          {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 0, ""},
          {"SendRequestBySocketPost: Write data faild, write N/N.\n"}),
    Meets("AnUploadReadLate", {Pause(kLong), DiscardUntilEnd()}, Upload,
          Sent(HTTP_RET_NOT_READY, 0, "all")),
    Meets("AnUploadNotRead", {ExpectBytes(1), Pause(kLong), Reset()}, Upload,
          Sent(HTTP_RET_NOT_READY, 0, "a part")),
    Meets("AnUploadReadLateOverTls", {Pause(kLong), DiscardUntilEnd()}, UploadOverTls,
          Sent(HTTP_RET_NOT_READY, 0, "all"), {}, true),
    Meets("AnUploadNotReadOverTls", {ExpectBytes(1), Pause(kLong), Reset()}, UploadOverTls,
          Sent(HTTP_RET_NOT_READY, 0, "failure"), {}, true),
};

struct Played {
  Outcome outcome;
  long thread = 0;
  std::vector<std::string> log;
};

}  // namespace

class Timing : public ::testing::TestWithParam<Scenario> {
 protected:
  static void SetUpTestSuite() {
    const DescriptorGuard descriptors;
    constexpr int kDebug = 5;
    const LogCapture log(kDebug);
    std::vector<std::thread> threads;
    for (const Scenario& scenario : kTimings) threads.emplace_back(Play, std::cref(scenario));
    for (std::thread& thread : threads) thread.join();
    for (auto& [name, played] : played_) {
      for (const LogLine& line : log.Lines("http")) {
        if (line.tid == played.thread) played.log.push_back(line.function + ": " + line.message);
      }
    }
  }

  static void TearDownTestSuite() { played_.clear(); }

  static void Play(const Scenario& scenario) {
    Played played;
    {
      const auto peer = scenario.peer.empty() ? nullptr : PeerOf(scenario);
      RunOnSmallStack(scenario.stack, [&] {
        played.thread = syscall(SYS_gettid);
        played.outcome = scenario.operation(peer != nullptr ? peer->Port() : 0);
      });
    }
    std::lock_guard<std::mutex> lock(mutex_);
    played_[scenario.name] = played;
  }

  static std::mutex mutex_;
  static std::map<std::string, Played> played_;
};

std::mutex Timing::mutex_;
std::map<std::string, Played> Timing::played_;

TEST_P(Timing, EndsAsTheTableSays) {
  const Scenario& scenario = GetParam();
  const Played& played = played_[scenario.name];
  std::vector<std::string> log;
  for (const std::string& line : played.log) log.push_back(MaskNumbers(line));
  std::vector<std::string> expected;
  for (const std::string& line : scenario.log) expected.push_back(MaskNumbers(line));
  EXPECT_EQ(played.outcome, scenario.expected);
  EXPECT_EQ(log, expected);
}

INSTANTIATE_TEST_SUITE_P(Hostile, Timing, ::testing::ValuesIn(kTimings), ScenarioName);
