// A program of somebody else: it includes every public header, uses something of each layer through
// the installed library, and brings settings-file functions of its own.
#include <cstdio>
#include <cstring>
#include <memory>

#include "tarnwick/http/twcurl.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/sslsocket.h"
#include "tarnwick/net/twsocket.h"
#include "tarnwick/platform/export.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tarnwick/utils/utils.h"

extern "C" int QLIBCFileGetKeyValue(const char*, const char* key, char* value, int size, int) {
  return std::snprintf(value, static_cast<size_t>(size), "%s",
                       std::strstr(key, "time_scale") ? "yes" : "1,2");
}

namespace {

int failures = 0;

void Expect(bool condition, const char* what) {
  if (condition) return;
  std::printf("not so: %s\n", what);
  ++failures;
}

void CheckLog() {
  Expect(g_pDbgLogCfg == nullptr, "no record of levels without a managing process");
  Expect(std::strcmp(Enum2String(LOG_CATEG_HTTP), "http") == 0, "categories have names");
  TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "a line from %s\n", "outside");
  std::FILE* log = std::fopen("/var/log/tarnwick/tarnwick.log", "r");
  char line[256] = "";
  Expect(log != nullptr && std::fgets(line, sizeof(line), log) != nullptr, "a log is written");
  Expect(std::strstr(line, "consumer.cpp") != nullptr, "the line names this file");
  if (log != nullptr) std::fclose(log);
}

void CheckOwnSettingsFunction() {
  TWDbgLogCfg levels{};
  Expect(levels.Init(0) == 0, "the levels are loaded");
  Expect(levels.Level(LOG_CATEG_ACCOUNT_API) == 2, "the program's own function was asked");
  Expect(levels.TimeScale(), "for both keys");
}

void CheckUtilsAndNet() {
  Expect(UrlEncode("a b", "") == "a%20b", "text is encoded");
  auto plain = std::make_unique<TWSocket>("127.0.0.1", 1, 1, true);
  Expect(plain->Connect() != 0, "nobody listens on port 1");
  auto tls = std::make_unique<SSLSocket>();
  tls->SetSocketInfo("127.0.0.1", 1, 1, true);
  Expect(tls->Connect() != 0, "nobody listens on port 1, with TLS neither");
}

void CheckHttp() {
  Json::Value reply;
  Expect(SendHttpGet("127.0.0.1", 1, "/", reply, 1, false) == -1, "a request fails");
  CURL* handle = TWCurlInit();
  Expect(handle != nullptr, "libcurl is ready");
  curl_easy_cleanup(handle);
}

}  // namespace

int main() {
  CheckLog();
  CheckOwnSettingsFunction();
  CheckUtilsAndNet();
  CheckHttp();
  return failures == 0 ? 0 : 1;
}
