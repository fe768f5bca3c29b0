// A TLS connection, cut after every byte that the server sends: in its handshake messages, its
// tickets, the record of its response and its close notice.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/bio.h>
#include <openssl/ssl.h>

#include <limits>
#include <memory>
#include <string>
#include <vector>

#include "tests/hostile/hostile_util.h"

namespace {

constexpr char kResponse[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";
constexpr size_t kNowhere = std::numeric_limits<size_t>::max();

// Where the parts of one connection's bytes ended; kNowhere when they were not reached.
struct Marks {
  size_t handshake = kNowhere;  // the last byte that the client's handshake needs
  size_t response = kNowhere;
  size_t all = kNowhere;
};

// A TLS server whose bytes end after the first `limit` ones. What it would send beyond is counted
// and dropped.
class CutTlsServer {
 public:
  CutTlsServer(const TlsIdentity& identity, PeerConnection& peer, size_t limit)
      : context_(identity.NewServerContext()),
        ssl_(SSL_new(context_)),
        from_client_(BIO_new(BIO_s_mem())),
        to_client_(BIO_new(BIO_s_mem())),
        peer_(peer),
        limit_(limit) {
    SSL_set_bio(ssl_, from_client_, to_client_);
    SSL_set_accept_state(ssl_);
  }

  ~CutTlsServer() {
    SSL_free(ssl_);
    SSL_CTX_free(context_);
  }

  CutTlsServer(const CutTlsServer&) = delete;
  CutTlsServer& operator=(const CutTlsServer&) = delete;

  // Results: false when the client went away, or had to: the handshake was cut.
  bool Handshake(Marks* marks) {
    while (SSL_do_handshake(ssl_) != 1) {
      if (!Flush() || made_ > limit_ || !Feed()) return false;
    }
    // Of TLS 1.3 the client has all it needs already; what follows are tickets.
    const size_t before = made_;
    if (!Flush()) return false;
    marks->handshake = SSL_version(ssl_) < TLS1_3_VERSION ? made_ : before;
    return marks->handshake <= limit_;
  }

  bool ReadRequest() {
    std::string request;
    char piece[4096];
    while (request.find("\r\n\r\n") == std::string::npos) {
      const int count = SSL_read(ssl_, piece, sizeof(piece));
      if (count > 0) request.append(piece, static_cast<size_t>(count));
      if (count <= 0 && !Feed()) return false;
    }
    return true;
  }

  void Response(Marks* marks) {
    SSL_write(ssl_, kResponse, sizeof(kResponse) - 1);
    marks->response = made_ + static_cast<size_t>(BIO_ctrl_pending(to_client_));
    SSL_shutdown(ssl_);
    Flush();
    marks->all = made_;
  }

 private:
  bool Flush() {
    std::string output(BIO_ctrl_pending(to_client_), '\0');
    if (output.empty()) return true;
    BIO_read(to_client_, output.data(), static_cast<int>(output.size()));
    const size_t left = limit_ - std::min(made_, limit_);
    made_ += output.size();
    return peer_.SendRaw(output.substr(0, left));
  }

  bool Feed() {
    std::string raw;
    if (peer_.ReadRaw(&raw) != PeerConnection::Read::kData) return false;
    return BIO_write(from_client_, raw.data(), static_cast<int>(raw.size())) > 0;
  }

  SSL_CTX* context_;
  SSL* ssl_;
  BIO* from_client_;
  BIO* to_client_;
  PeerConnection& peer_;
  const size_t limit_;
  size_t made_ = 0;
};

Step ServeUpTo(const TlsIdentity& identity, size_t limit, Marks* marks) {
  return {"ServeUpTo(" + std::to_string(limit) + ")",
          [&identity, limit, marks](PeerConnection& peer, std::string* error) {
            CutTlsServer server(identity, peer, limit);
            if (server.Handshake(marks) && server.ReadRequest()) server.Response(marks);
            if (peer.DeadlinePassed()) *error = "deadline passed";
            return !peer.DeadlinePassed();
          }};
}

// Closes, whatever the client has sent meanwhile: its own close notice, for one.
Step CloseAsItStands() {
  return {"CloseAsItStands()",
          [](PeerConnection& peer, std::string*) {
            peer.TakeArrived();
            peer.CloseRaw();
            return true;
          },
          false};
}

struct TlsCutCase {
  std::string name;
  int version;
  bool reset;
};

std::ostream& operator<<(std::ostream& out, const TlsCutCase& test) {
  return out << test.name;
}

const TlsCutCase kCases[] = {{"Tls13Close", TLS1_3_VERSION, false},
                             {"Tls13Reset", TLS1_3_VERSION, true},
                             {"Tls12Close", TLS1_2_VERSION, false},
                             {"Tls12Reset", TLS1_2_VERSION, true}};

struct TlsRun {
  size_t limit = kNowhere;
  Marks marks = {};
  Outcome outcome = {};
  std::vector<std::string> log = {};
};

Outcome GetAndReadBody(ExposedClient& client) {
  const int sent = client.SendRequestByGet();
  if (sent != HTTP_RET_OK) return OutcomeOf(client, sent, "not sent");
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, body);
}

void RunAll(const TlsCutCase& test, std::vector<TlsRun>* runs) {
  constexpr int kDebug = 5;
  const TlsIdentity identity(TlsOptions{false, false, test.version});
  std::vector<Script> scripts;
  for (TlsRun& run : *runs) {
    const Step ending = test.reset ? Reset() : CloseAsItStands();
    scripts.push_back({ServeUpTo(identity, run.limit, &run.marks), ending});
  }
  LogCapture log(kDebug);
  ScriptedPeer peer(scripts);
  ClientSettings settings;
  settings.https = true;
  RunOnSmallStack(kSmallStack, [&] {
    for (TlsRun& run : *runs) {
      log.Clear();
      ExposedClient client(peer.Port(), settings);
      run.outcome = GetAndReadBody(client);
      run.log = HttpLog(log);
    }
  });
}

// Nothing of a record counts before it is whole.
void ExpectOutcome(const TlsRun& run) {
  const bool connects = run.limit >= run.marks.handshake;
  const bool responses = run.limit >= run.marks.response;
  Outcome outcome = {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 0, "not sent"};
  std::vector<std::string> log = {"SendRequestByGet: Connection failed!\n"};
  if (connects) {
    outcome = NoResponse();
    log = {"ReadBody: Read data error\n"};
  }
  if (responses) {
    outcome = Success("body");
    log.clear();
  }
  EXPECT_EQ(run.outcome, outcome) << "cut at " << run.limit;
  EXPECT_EQ(run.log, log) << "cut at " << run.limit;
}

// The bytes of a whole connection; they vary by a few, as signatures do.
size_t BytesOf(const TlsCutCase& test) {
  std::vector<TlsRun> runs(1);
  RunAll(test, &runs);
  EXPECT_EQ(runs[0].outcome, Success("body"));
  return runs[0].marks.all;
}

}  // namespace

class TlsCuts : public ::testing::TestWithParam<TlsCutCase> {};

TEST_P(TlsCuts, AtEveryByteEndTheHandshakeOrTheResponse) {
  const DescriptorGuard descriptors;
  const size_t bytes = BytesOf(GetParam());
  ASSERT_LT(bytes, 4000u);
  std::vector<TlsRun> runs(bytes + 1);
  for (size_t i = 0; i < runs.size(); ++i) runs[i].limit = i;
  RunAll(GetParam(), &runs);
  for (const TlsRun& run : runs) ExpectOutcome(run);
}

INSTANTIATE_TEST_SUITE_P(Hostile, TlsCuts, ::testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });
