// The POSTs, body reads, uploads and XML requests, with the first, second, third ... call failing.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/parser.h>
#include <libxml/tree.h>
#include <poll.h>
#include <sys/socket.h>

#include <cstdint>

#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

namespace {

constexpr char kErrorText[] = "{\"error\":true}";
constexpr char kXmlReply[] = "HTTP/1.1 200 OK\r\nContent-Length: 11\r\n\r\n<a>text</a>";
constexpr char kChunkedReply[] =
    "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n4\r\nWiki\r\n5\r\npedia\r\n0\r\n\r\n";

constexpr Call kSystemCalls[] = {Call::kSocket,     Call::kGetaddrinfo,   Call::kFcntl,
                                 Call::kConnect,    Call::kSelect,        Call::kGetsockopt,
                                 Call::kSetsockopt, Call::kIoctl,         Call::kWrite,
                                 Call::kRead,       Call::kPthreadSigmask};

constexpr Call kAllocations[] = {Call::kMalloc, Call::kCalloc, Call::kRealloc, Call::kStrdup};

// Those without which an exchange cannot come to its end.
constexpr Call kVital[] = {Call::kSocket, Call::kGetaddrinfo, Call::kConnect, Call::kWrite,
                           Call::kRead};

ClientSettings WithLogin() {
  ClientSettings settings;
  settings.user = "u";
  settings.password = "p";
  return settings;
}

// Runs `operation` with each call of these kinds failing in turn; no run leaves a descriptor.
template <typename Calls, typename Operation>
void ForEachFailing(const Calls& calls, Operation operation) {
  for (const Call call : calls) {
    const DescriptorGuard guard;
    ForEachFailingCall(call, operation);
  }
}

// The result of an operation is the good one, or the failing one after a failure.
template <typename T>
void ExpectOneOf(const T& result, const T& good, const T& bad, const Faults& faults) {
  EXPECT_TRUE(result == good || (result == bad && faults.Struck())) << result;
}

// A document that is freed at the end.
struct OwnedDoc {
  ~OwnedDoc() { xmlFreeDoc(doc); }
  xmlDoc* doc = nullptr;
};

// A server in a process of its own, so that its descriptors are not this one's: answers each
// request with `response` and waits for the client to close.
class RequestServer {
 public:
  explicit RequestServer(const std::string& response)
      : listener_(Listener(&port_)), child_([this, response] { return Run(response); }) {
    close(listener_);
  }

  int Port() const { return port_; }

 private:
  static constexpr size_t kEndless = 1 << 20;  // a body of this size or more is not waited for

  static int Listener(int* port) {
    const int fd = BindLoopback(port);
    if (listen(fd, 64) != 0) ADD_FAILURE() << "the server cannot listen";
    return fd;
  }

  int Run(const std::string& response) const {
    while (Readable(listener_, 60000)) {
      const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
      if (ReadRequest(fd)) {
        send(fd, response.data(), response.size(), MSG_NOSIGNAL);
        char rest[256];
        while (Readable(fd, 2000) && recv(fd, rest, sizeof(rest), 0) > 0) continue;
      }
      close(fd);
    }
    return 0;
  }

  static bool ReadRequest(int fd) {
    std::string request;
    char buf[4096];
    while (!IsWhole(request)) {
      if (!Readable(fd, 2000)) return false;
      const ssize_t n = recv(fd, buf, sizeof(buf), 0);
      if (n <= 0) return false;
      request.append(buf, static_cast<size_t>(n));
    }
    return true;
  }

  static bool IsWhole(const std::string& request) {
    const size_t head = request.find("\r\n\r\n");
    if (head == std::string::npos) return false;
    const size_t line = request.find("Content-Length: ");
    if (line > head) return true;
    const uint64_t length = std::stoull(request.substr(line + 16));
    return length >= kEndless || request.size() >= head + 4 + length;
  }

  static bool Readable(int fd, int milliseconds) {
    pollfd waiting = {fd, POLLIN, 0};
    return poll(&waiting, 1, milliseconds) > 0;
  }

  int port_ = 0;
  const int listener_;
  Child child_;
};

// An XML request and the parse of its response.
struct XmlRun {
  int result;
  bool parsed;
};

XmlRun RunXml(int sender, int port) {
  ClientProbe client(port, WithLogin());
  OwnedDoc sent;
  sent.doc = xmlParseMemory("<r/>", 4);
  const int result = sender == 0   ? client.SendReqByXMLGet(5)
                     : sender == 1 ? client.SendReqByXMLPost(sent.doc)
                     : sender == 2 ? client.SendReqByXMLPut(sent.doc)
                                   : client.SendReqByXMLDelete();
  EXPECT_TRUE(client.m_result == result || client.m_result == HTTP_RET_NOT_READY);
  OwnedDoc answer;
  const bool parsed = client.GetResponseXML(answer.doc);
  EXPECT_EQ(parsed, answer.doc != nullptr);
  return {result, parsed};
}

}  // namespace

TEST(FormPostFaults, WhicheverCallFailsTheResultIsDocumentedAndNothingIsLeft) {
  RequestServer server(kXmlReply);
  const auto post = [&](Faults& faults) {
    ClientProbe client(server.Port());
    const int result = client.SendRequestBySocketPost("a=1");
    ExpectOneOf<int>(result, HTTP_RET_OK, HTTP_RET_IO_ERROR, faults);
    EXPECT_TRUE(faults.Struck() || client.m_result == HTTP_RET_OK);
  };
  ForEachFailing(kSystemCalls, post);
  ForEachFailing(kAllocations, post);
}

TEST(OneCallPostFaults, WhicheverCallFailsTheResultIsDocumentedAndNothingIsThrown) {
  RequestServer server(kXmlReply);
  const auto post = [&](Faults& faults) {
    int result = 1;
    EXPECT_NO_THROW(result = SendHttpPost("127.0.0.1", server.Port(), "x", "a=1", "s=1", 5));
    ExpectOneOf(result, 0, -1, faults);
  };
  ForEachFailing(kSystemCalls, post);
  ForEachFailing(kAllocations, post);
}

TEST(OneCallPostFaults, AFailingSocketLookupConnectOrWriteFailsTheCall) {
  RequestServer server(kXmlReply);
  for (const Call call : {Call::kSocket, Call::kGetaddrinfo, Call::kConnect, Call::kWrite}) {
    Faults faults;
    faults.FailFrom(call, 1);
    EXPECT_EQ(SendHttpPost("127.0.0.1", server.Port(), "x", "a=1", "s=1", 5), -1) << CallName(call);
  }
}

TEST(SoapPostFaults, WhicheverCallFailsTheReplyIsWholeOrUntouched) {
  RequestServer server(kXmlReply);
  const auto post = [&](Faults& faults) {
    ClientProbe client(server.Port());
    std::string response = "old";
    const int result = client.SendReqBySocketPost("x", response);
    ExpectOneOf<int>(result, HTTP_RET_OK, HTTP_RET_IO_ERROR, faults);
    EXPECT_EQ(response, result == HTTP_RET_OK ? "<a>text</a>" : "old");
  };
  ForEachFailing(kSystemCalls, post);
  ForEachFailing(kAllocations, post);
}

TEST(SoapPostFaults, WithoutAVitalCallItIsAnIoError) {
  RequestServer server(kXmlReply);
  for (const Call call : kVital) {
    ClientProbe client(server.Port());
    std::string response = "old";
    Faults faults;
    faults.FailFrom(call, 1);
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR) << CallName(call);
    EXPECT_EQ(response, "old");
  }
}

TEST(SoapLoginFaults, WhicheverCallFailsTheResultIsThatOfTheLastExchange) {
  for (const std::string challenge : {"Basic x", "Digest realm=\"r\", nonce=\"n\""}) {
    RequestServer server("HTTP/1.1 401 No\r\nWWW-Authenticate: " + challenge +
                         "\r\nContent-Length: 2\r\n\r\nno");
    const auto post = [&](Faults& faults) {
      ClientProbe client(server.Port(), WithLogin());
      std::string response = "old";
      int result = -1;
      EXPECT_NO_THROW(result = client.SendAuthReqBySocketPost("x", response));
      EXPECT_TRUE(result == HTTP_RET_UNAUTHORIZED || faults.Struck()) << result;
      EXPECT_TRUE(result == HTTP_RET_UNAUTHORIZED || result == HTTP_RET_IO_ERROR) << result;
      EXPECT_TRUE(response == "no" || (response == "old" && faults.Struck())) << response;
    };
    ForEachFailing(kSystemCalls, post);
    ForEachFailing(kAllocations, post);
  }
}

TEST(SoapXmlFaults, WhicheverCallFailsTheDocumentIsWholeOrUntouched) {
  RequestServer server(kXmlReply);
  const auto post = [&](Faults& faults) {
    ClientProbe client(server.Port());
    OwnedDoc answer;
    const int result = client.SendReqByXMLSocketPost("x", answer.doc);
    ExpectOneOf<int>(result, HTTP_RET_OK, HTTP_RET_IO_ERROR, faults);
    EXPECT_EQ(answer.doc != nullptr, result == HTTP_RET_OK);
  };
  ForEachFailing(kSystemCalls, post);
  ForEachFailing(kAllocations, post);
}

TEST(BodyFaults, WhicheverCallFailsAfterTheHeadTheBodyIsAFrontPartOfTheWhole) {
  RequestServer server(kChunkedReply);
  for (const bool buffered : {false, true}) {
    ClientSettings settings;
    settings.buffered = buffered;
    const auto read = [&](Faults& faults) {
      ClientProbe client(server.Port(), settings);
      const int sent = client.SendRequestBySocketPost("a=1");
      std::string body;
      const int result = client.ReadBody(body);
      ExpectOneOf<int>(result, HTTP_RET_OK, HTTP_RET_IO_ERROR, faults);
      EXPECT_EQ(std::string("Wikipedia").substr(0, body.size()), body);
      EXPECT_TRUE(faults.Struck() || (sent == HTTP_RET_OK && body == "Wikipedia"));
    };
    ForEachFailing(kSystemCalls, read);
    ForEachFailing(kAllocations, read);
  }
}

TEST(GetRespFaults, WhicheverCallFailsItGivesTheBodyAFrontPartOrTheErrorText) {
  RequestServer server(kChunkedReply);
  const auto read = [&](Faults& faults) {
    ClientProbe client(server.Port());
    const int sent = client.OpenRawDataUpload();
    ExpectOneOf<int>(sent, HTTP_RET_OK, HTTP_RET_IO_ERROR, faults);
    if (sent != HTTP_RET_OK) return;
    const std::string body = client.GetResp();
    const bool part = std::string("Wikipedia").substr(0, body.size()) == body;
    EXPECT_TRUE(body == "Wikipedia" || (faults.Struck() && (part || body == kErrorText))) << body;
  };
  ForEachFailing(kSystemCalls, read);
  ForEachFailing(kAllocations, read);
}

TEST(UploadFaults, AFailingSocketLookupConnectOrWriteFailsIt) {
  RequestServer server(kChunkedReply);
  for (const Call call : {Call::kSocket, Call::kGetaddrinfo, Call::kConnect, Call::kWrite}) {
    const DescriptorGuard guard;
    ClientProbe client(server.Port());
    Faults faults;
    faults.FailFrom(call, 1);
    EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_IO_ERROR) << CallName(call);
    EXPECT_EQ(client.m_connState, 0);
  }
}

TEST(XmlFaults, WhicheverCallOfLibcurlFailsTheResultIsAnIoErrorAndAllIsReleased) {
  RequestServer server(kXmlReply);
  constexpr Call kCalls[] = {Call::kCurlEasyInit,    Call::kCurlEasySetopt,  Call::kCurlSlistAppend,
                             Call::kCurlEasyPerform, Call::kCurlEasyGetinfo, Call::kTmpfile};
  for (int sender = 0; sender < 4; ++sender) {
    SCOPED_TRACE(sender);
    ForEachFailing(kCalls, [&](Faults& faults) {
      const XmlRun run = RunXml(sender, server.Port());
      EXPECT_EQ(run.result, faults.Struck() ? HTTP_RET_IO_ERROR : HTTP_RET_OK);
      EXPECT_TRUE(run.parsed || faults.Struck());
      const bool no_handle = faults.Struck() && faults.CurlOptions().empty();
      EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), no_handle ? 0 : 1);
      const int opened = faults.Count(Call::kTmpfile);
      EXPECT_TRUE(faults.Count(Call::kFclose) == opened || (faults.Struck() && opened == 1));
    });
  }
}

TEST(XmlFaults, WhicheverAllocationFailsTheAnswerIsWholeOrNone) {
  RequestServer server(kXmlReply);
  for (int sender = 0; sender < 4; ++sender) {
    SCOPED_TRACE(sender);
    ForEachFailing(kAllocations, [&](Faults& faults) {
      const XmlRun run = RunXml(sender, server.Port());
      ExpectOneOf<int>(run.result, HTTP_RET_OK, HTTP_RET_IO_ERROR, faults);
      EXPECT_TRUE(run.parsed || faults.Struck());
    });
  }
}

TEST(XmlFaults, AFailingCloseOfTheTemporaryFileDoesNotCount) {
  RequestServer server(kXmlReply);
  const DescriptorGuard guard;
  Faults faults;
  faults.FailFrom(Call::kFclose, 1);
  const XmlRun run = RunXml(2, server.Port());
  EXPECT_EQ(run.result, HTTP_RET_OK);
  EXPECT_TRUE(run.parsed);
}

TEST(PostFaults, WhicheverCallOfTheLogFailsTheResultsAreTheSame) {
  RequestServer server(kXmlReply);
  const LogCapture log;
  for (const Call call : {Call::kOpen, Call::kFopen, Call::kFlock, Call::kLocaltimeR}) {
    Faults faults;
    faults.FailFrom(call, 1);
    ClientProbe client(server.Port());
    std::string response;
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK) << CallName(call);
    EXPECT_EQ(response, "<a>text</a>");
    EXPECT_EQ(client.SendReqBySocketPost("", response), HTTP_RET_IO_ERROR);
    client.m_pSocket->Disconnect();  // the server takes one connection after the other
    EXPECT_EQ(SendHttpPost("127.0.0.1", server.Port(), "x", "a=1", "", 5), 0);
  }
}
