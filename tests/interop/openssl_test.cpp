// openssl s_server: the end of a TLS connection with and without a close notice, and certificates
// that libcurl must refuse. Renegotiation is off everywhere.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>
#include <unistd.h>

#include "tarnwick/net/sslsocket.h"
#include "tests/interop/certificates.h"
#include "tests/interop/servers.h"
#include "tests/support/log_capture.h"

namespace {

constexpr char kServer[] = "openssl s_server";

// With "-WWW" in `options` it serves the files of its directory, and closes with a notice. Without, it
// sends what Say is given, and closes without a notice when it is killed.
class TlsServer {
 public:
  TlsServer(const std::string& certificate, const std::vector<std::string>& options) {
    const int taken = BindLoopback(&port_);
    close(taken);
    EXPECT_EQ(pipe2(input_, O_CLOEXEC), 0);
    std::vector<std::string> command = {"/usr/bin/env",
                                        "-C",
                                        directory_.Path(),
                                        "/usr/bin/openssl",
                                        "s_server",
                                        "-accept",
                                        "127.0.0.1:" + std::to_string(port_),
                                        "-no_renegotiation",
                                        "-cert",
                                        Certificates().File(certificate)};
    command.insert(command.end(), options.begin(), options.end());
    process_ = std::make_unique<ServerProgram>(command, Log(), input_[0]);
    AwaitOutput("ACCEPT");
  }

  ~TlsServer() {
    close(input_[0]);
    close(input_[1]);
  }

  int Port() const { return port_; }
  void Serve(const std::string& name, const std::string& text) {
    WriteFile(directory_.File(name), text);
  }
  void Say(const std::string& text) {
    EXPECT_EQ(write(input_[1], text.data(), text.size()), static_cast<ssize_t>(text.size()));
  }
  void Kill() { process_->Kill(); }

  bool AwaitOutput(const std::string& text) {
    const std::string log = Log();
    return WaitUntilTrue(("s_server prints " + text).c_str(),
                         [&] { return ReadFile(log).find(text) != std::string::npos; });
  }

 private:
  std::string Log() const { return directory_.File("output.log"); }

  TempDir directory_;
  int port_ = 0;
  int input_[2] = {-1, -1};
  std::unique_ptr<ServerProgram> process_;
};

struct TlsCase {
  const char* option;
  const char* transport;
  bool buffered;
};

constexpr TlsCase kTlsCases[] = {{"-tls1_2", "TLS 1.2", true},
                                 {"-tls1_2", "TLS 1.2", false},
                                 {"-tls1_3", "TLS 1.3", true},
                                 {"-tls1_3", "TLS 1.3", false}};

class SServer : public ::testing::TestWithParam<TlsCase> {
 protected:
  void WorkedHere(const std::string& operation) {
    AddRow({operation, kServer, "none", GetParam().transport,
            GetParam().buffered ? "buffered" : "direct", "passed"});
  }

  ClientSettings Settings(const std::string& path) {
    ClientSettings settings = LoginTo({true, GetParam().buffered}, path);
    settings.timeout = 1;
    return settings;
  }
};

INSTANTIATE_TEST_SUITE_P(, SServer, ::testing::ValuesIn(kTlsCases), [](const auto& test) {
  return std::string(test.param.transport[6] == '2' ? "Tls12" : "Tls13") +
         (test.param.buffered ? "Buffered" : "Direct");
});

TEST_P(SServer, EndsABodyWithACloseNotice) {
  WorkedHere("ReadBody (close notice)");
  TlsServer server("good", {"-WWW", GetParam().option});
  server.Serve("info.txt", std::string(50000, 'x'));
  ExposedClient client(server.Port(), Settings("info.txt"));
  ASSERT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(&client), 200);
  EXPECT_EQ(BodyOf(&client), std::string(50000, 'x'));
}

TEST_P(SServer, EndsABodyWithoutACloseNotice) {
  WorkedHere("ReadBody (no close notice)");
  TlsServer server("good", {GetParam().option});
  server.Say("HTTP/1.0 200 OK\r\n\r\nbody");
  ExposedClient client(server.Port(), Settings("info.txt"));
  ASSERT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  ASSERT_TRUE(server.AwaitOutput("User-Agent"));
  server.Kill();
  EXPECT_EQ(BodyOf(&client), "body");
}

// With TLS 1.3 the server asks after the client's handshake has ended.
TEST(SServerClientCertificate, IsNamedInTheLogWhenThereIsNone) {
  TlsServer server("good", {"-Verify", "1", "-verify_return_error", "-tls1_3"});
  LogCapture log;
  SSLSocket socket("127.0.0.1", server.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  char line[16];
  EXPECT_EQ(socket.ReadToLineEnd(line, sizeof(line)), 0);
  EXPECT_TRUE(socket.IsEOF());
  EXPECT_THAT(
      log.Lines("socket"),
      ::testing::Contains(::testing::Field(
          &LogLine::message,
          ::testing::MatchesRegex("Read error \\[1\\] \\[error:.*certificate required\\].\n"))));
}

// ---- certificates

struct CertificateCase {
  const char* kind;
  int by_curl;   // SendRequestByCurl with verification
  int one_call;  // SendHttpsGet
};

constexpr CertificateCase kCertificates[] = {{"good", HTTP_RET_OK, 0},
                                             {"self-signed", HTTP_RET_CERT_ERROR, -2},
                                             {"wrong-host", HTTP_RET_CERT_ERROR, -2},
                                             {"expired", HTTP_RET_CERT_ERROR, -2}};

class SServerCertificate : public ::testing::TestWithParam<CertificateCase> {
 protected:
  SServerCertificate() { server_.Serve("info.json", "{\"success\":true}"); }

  void AddCertificateRow(const std::string& operation, const std::string& reading, bool accepted) {
    AddRow({operation + ", certificate " + GetParam().kind, kServer, "none", "TLS", reading,
            accepted ? "passed" : "passed: the certificate is refused"});
  }

  ClientSettings Settings() { return LoginTo({true, false}, "info.json"); }

  TlsServer server_{GetParam().kind, {"-WWW"}};
};

INSTANTIATE_TEST_SUITE_P(, SServerCertificate, ::testing::ValuesIn(kCertificates),
                         [](const auto& test) {
                           std::string name = test.param.kind;
                           name.erase(std::remove(name.begin(), name.end(), '-'), name.end());
                           return name;
                         });

TEST_P(SServerCertificate, IsVerifiedByLibcurl) {
  const TrustedAuthority trusted(Certificates().CaFile());
  AddCertificateRow("SendRequestByCurl, verified", "libcurl", GetParam().one_call == 0);
  AddCertificateRow("SendHttpsGet", "libcurl", GetParam().one_call == 0);
  ExposedClient client(server_.Port(), Settings());
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), GetParam().by_curl);
  Json::Value response;
  EXPECT_EQ(SendHttpsGet("127.0.0.1", server_.Port(), "info.json", response, 10),
            GetParam().one_call);
}

TEST_P(SServerCertificate, DoesNotMatterWithoutVerification) {
  AddCertificateRow("SendRequestByCurl, not verified", "libcurl", true);
  AddCertificateRow("SendRequestByGet", "direct", true);
  ExposedClient client(server_.Port(), Settings());
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 10), HTTP_RET_OK);
  EXPECT_EQ(client.GetCurlText(), "{\"success\":true}");
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(BodyOf(&client), "{\"success\":true}");
}

}  // namespace
