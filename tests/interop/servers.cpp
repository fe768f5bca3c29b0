#include "tests/interop/servers.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

namespace {

std::unique_ptr<WebServer> g_apache, g_nginx, g_lighttpd;

class StopServers : public ::testing::Environment {
 public:
  void TearDown() override {
    g_nginx.reset();  // it asks Apache
    g_lighttpd.reset();
    g_apache.reset();
  }
};

const auto* const kStopServers = ::testing::AddGlobalTestEnvironment(new StopServers);

void FillNginx(const WebServer& server) {
  mkdir(server.File("www/store").c_str(), 0755);
  WriteFile(server.File("www/empty"), "");
  WriteFile(server.File("www/byte"), "x");
  std::string large(kLargeFile, '\0');
  for (size_t i = 0; i < large.size(); ++i) large[i] = static_cast<char>('a' + i % 23);
  WriteFile(server.File("www/large"), large);
}

}  // namespace

WebServer& Apache() {
  if (!g_apache) {
    g_apache = std::make_unique<WebServer>(
        WebServerSetup{"Apache httpd",
                       {"/usr/sbin/apache2", "-D", "FOREGROUND", "-f", "@CONFIG@"},
                       {"apache.conf"},
                       {"PORT", "TLS_PORT", "KEEP_PORT"},
                       {}});
  }
  return *g_apache;
}

WebServer& Nginx() {
  if (!g_nginx) {
    g_nginx = std::make_unique<WebServer>(
        WebServerSetup{"nginx",
                       {"/usr/sbin/nginx", "-c", "@CONFIG@"},
                       {"nginx.conf", "locations.conf"},
                       {"PORT", "TLS12_PORT", "TLS13_PORT"},
                       {{"UPSTREAM_PORT", std::to_string(Apache().Port())}}});
    FillNginx(*g_nginx);
  }
  return *g_nginx;
}

WebServer& Lighttpd() {
  if (!g_lighttpd) {
    g_lighttpd =
        std::make_unique<WebServer>(WebServerSetup{"lighttpd",
                                                   {"/usr/sbin/lighttpd", "-D", "-f", "@CONFIG@"},
                                                   {"lighttpd.conf"},
                                                   {"PORT", "TLS_PORT"},
                                                   {}});
  }
  return *g_lighttpd;
}

ClientSettings LoginTo(const Mode& mode, const std::string& path) {
  ClientSettings settings;
  settings.path = path;
  settings.user = kUser;
  settings.password = kPassword;
  settings.https = mode.tls;
  settings.buffered = mode.buffered;
  settings.timeout = 15;
  return settings;
}

std::unique_ptr<ClientProbe> NewClient(const WebServer& server, const ClientSettings& settings) {
  return std::make_unique<ClientProbe>(server.Port(settings.https ? "TLS_PORT" : "PORT"), settings);
}

std::string BodyOf(TWHttpClient* client) {
  std::string body;
  EXPECT_EQ(client->ReadBody(body), HTTP_RET_OK);
  return body;
}

int StatusOf(TWHttpClient* client) {
  int status = 0;
  client->CheckResponse(status);
  return status;
}
