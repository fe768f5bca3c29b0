#include "tests/interop/servers.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

std::vector<std::unique_ptr<WebServer>> g_servers;

class StopServers : public ::testing::Environment {
 public:
  void TearDown() override {
    while (!g_servers.empty()) g_servers.pop_back();  // some ask those that started before
  }
};

const auto* const kStopServers = ::testing::AddGlobalTestEnvironment(new StopServers);

// The server of that name, which the first call starts and gives its files.
WebServer& Running(const WebServerSetup& setup, void (*fill)(const WebServer&) = nullptr) {
  for (const auto& server : g_servers) {
    if (server->Name() == setup.name) return *server;
  }
  g_servers.push_back(std::make_unique<WebServer>(setup));
  if (fill != nullptr) fill(*g_servers.back());
  return *g_servers.back();
}

void FillNginx(const WebServer& server) {
  mkdir(server.File("www/store").c_str(), 0755);
  WriteFile(server.File("www/empty"), "");
  WriteFile(server.File("www/byte"), "x");
  std::string large(kLargeFile, '\0');
  for (size_t i = 0; i < large.size(); ++i) large[i] = static_cast<char>('a' + i % 23);
  WriteFile(server.File("www/large"), large);
}

// Files in the open and with credentials by Basic, and for busybox the programs of the cgi directory.
void FillSmall(const WebServer& server) {
  mkdir(server.File("www/basic").c_str(), 0755);
  for (const char* directory : {"www/", "www/basic/"}) {
    WriteFile(server.File(directory + std::string("info.json")), "{\"success\":true}");
  }
  WriteFile(server.File("www/info.xml"), "<response method=\"GET\"/>");
  EXPECT_EQ(symlink(TARNWICK_INTEROP_FOLDER "/cgi", server.File("www/cgi-bin").c_str()), 0);
}

std::string Upstream(const WebServer& server) {
  return std::to_string(server.Port());
}

}  // namespace

WebServer& Apache() {
  return Running({"Apache httpd",
                  {"/usr/sbin/apache2", "-D", "FOREGROUND", "-f", "@CONFIG@"},
                  {"apache.conf"},
                  {"PORT", "TLS_PORT", "KEEP_PORT"},
                  {}});
}

WebServer& Nginx() {
  return Running({"nginx",
                  {"/usr/sbin/nginx", "-c", "@CONFIG@"},
                  {"nginx.conf", "locations.conf"},
                  {"PORT", "TLS12_PORT", "TLS13_PORT", "KEEP_PORT"},
                  {{"UPSTREAM_PORT", Upstream(Apache())}}},
                 FillNginx);
}

WebServer& Lighttpd() {
  return Running({"lighttpd",
                  {"/usr/sbin/lighttpd", "-D", "-f", "@CONFIG@"},
                  {"lighttpd.conf"},
                  {"PORT", "TLS_PORT", "KEEP_PORT"},
                  {}});
}

WebServer& Gsoap() {
  return Running(
      {"gSOAP",
       {TARNWICK_PEERS_FOLDER "/gsoap_server", "@PORT@", "@DIGEST_PORT@", "@CHUNK_PORT@"},
       {},
       {"PORT", "DIGEST_PORT", "CHUNK_PORT"},
       {}});
}

WebServer& Microhttpd() {
  return Running(
      {"libmicrohttpd", {TARNWICK_PEERS_FOLDER "/mhd_server", "@PORT@"}, {}, {"PORT"}, {}});
}

WebServer& Poco() {
  return Running({"Poco",
                  {TARNWICK_PEERS_FOLDER "/poco_server", "@KEEP_PORT@", "@PORT@"},
                  {},
                  {"KEEP_PORT", "PORT"},
                  {}});
}

WebServer& Node() {
  return Running({"Node.js",
                  {"/usr/bin/node", "@FOLDER@/servers/node_server.js", "@ROOT@", "@PORT@",
                   "@TLS12_PORT@", "@TLS13_PORT@", "@MUTUAL12_PORT@", "@MUTUAL13_PORT@"},
                  {},
                  {"PORT", "TLS12_PORT", "TLS13_PORT", "MUTUAL12_PORT", "MUTUAL13_PORT"},
                  {}});
}

WebServer& Caddy() {
  return Running({"Caddy",
                  {"/usr/bin/env", "HOME=@ROOT@", "/usr/bin/caddy", "run", "--adapter", "caddyfile",
                   "--config", "@CONFIG@"},
                  {"Caddyfile"},
                  {"PORT", "TLS_PORT"},
                  {{"UPSTREAM_PORT", Upstream(Node())}}},
                 FillSmall);
}

WebServer& Haproxy() {
  return Running({"haproxy",
                  {"/usr/sbin/haproxy", "-db", "-f", "@CONFIG@"},
                  {"haproxy.cfg"},
                  {"PORT", "TLS_PORT", "DOWN_PORT"},
                  {{"UPSTREAM_PORT", Upstream(Node())}}});
}

WebServer& Stunnel() {
  return Running({"stunnel",
                  {"/usr/bin/stunnel4", "@CONFIG@"},
                  {"stunnel.conf"},
                  {"TLS12_PORT", "TLS13_PORT", "MUTUAL13_PORT"},
                  {{"UPSTREAM_PORT", Upstream(Node())}}});
}

WebServer& Busybox() {
  return Running({"busybox httpd",
                  {"/bin/busybox", "httpd", "-f", "-p", "127.0.0.1:@PORT@", "-h", "@ROOT@/www",
                   "-c", "@CONFIG@"},
                  {"busybox.conf"},
                  {"PORT"},
                  {}},
                 FillSmall);
}

#ifdef TARNWICK_TWCAMSIM
WebServer& SimulatedCamera() {
  return Running({"twcamsim",
                  Runnable({TARNWICK_TWCAMSIM, "--endpoint", "soap,port=@PORT@", "--endpoint",
                            "soap,port=@DIGEST_PORT@,login=digest"}),
                  {},
                  {"PORT", "DIGEST_PORT"},
                  {}});
}
#endif

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

std::unique_ptr<ExposedClient> NewClient(const WebServer& server, const ClientSettings& settings) {
  return std::make_unique<ExposedClient>(server.Port(settings.https ? "TLS_PORT" : "PORT"),
                                         settings);
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
