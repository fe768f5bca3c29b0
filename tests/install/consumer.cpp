// A program of somebody else: it includes every public header, uses something of each layer through
// the installed library, and brings settings-file functions of its own.
//
//   consumer           what works without a record of levels
//   consumer create    creates the record, as the product's managing process does
//   consumer attached  what a daemon finds that starts afterwards
#include <sys/ipc.h>
#include <sys/shm.h>

#include <cstring>
#include <memory>

#include "expect.h"
#include "tarnwick/http/twcurl.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/sslsocket.h"
#include "tarnwick/net/twrequestscope.h"
#include "tarnwick/net/twsocket.h"
#include "tarnwick/platform/export.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tarnwick/utils/utils.h"
#include "tarnwick/version.h"

extern "C" int QLIBCFileGetKeyValue(const char*, const char* key, char* value, int size, int) {
  return std::snprintf(value, static_cast<size_t>(size), "%s",
                       std::strstr(key, "time_scale") ? "yes" : "1,2");
}

namespace {

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
  Expect(TWVersionNumber() == TARNWICK_VERSION_NUMBER, "headers and library are of one version");
  Expect(UrlEncode("a b", "") == "a%20b", "text is encoded");
  auto plain = std::make_unique<TWSocket>("127.0.0.1", 1, 1, true);
  Expect(plain->Connect() != 0, "nobody listens on port 1");
  auto tls = std::make_unique<SSLSocket>();
  tls->SetSocketInfo("127.0.0.1", 1, 1, true);
  Expect(tls->Connect() != 0, "nobody listens on port 1, with TLS neither");
}

void CheckHttp() {
  Json::Value response;
  TWRequestScope scope;
  scope.SetEscapedLog(true);
  Expect(scope.Valid(), "there is memory for a scope");
  Expect(SendHttpGet("127.0.0.1", 1, "/", response, 1, false) == -1, "a request fails");
  CURL* handle = TWCurlInit();
  Expect(handle != nullptr, "libcurl is ready");
  curl_easy_cleanup(handle);
}

void CreateRecord() {
  const int segment = shmget(TWShmDbgLogIPCKey(), sizeof(TWDbgLogCfg), IPC_CREAT | IPC_EXCL | 0600);
  Expect(segment != -1, "there was no record");
  InitDbgCfg();
  Expect(g_pDbgLogCfg != nullptr, "the new record is attached");
  if (g_pDbgLogCfg == nullptr) return;
  g_pDbgLogCfg->SetLevel(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG3);
}

// Nothing of the program calls for it: the library does it when it is loaded, or linked in.
void CheckAttached() {
  Expect(g_pDbgLogCfg != nullptr, "the record is attached at the start");
  Expect(TWLogEnabled(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG3), "its levels count");
}

}  // namespace

int main(int argc, char** argv) {
  const char* const what = argc > 1 ? argv[1] : "";
  if (std::strcmp(what, "create") == 0) {
    CreateRecord();
  } else if (std::strcmp(what, "attached") == 0) {
    CheckAttached();
  } else {
    CheckLog();
    CheckOwnSettingsFunction();
    CheckUtilsAndNet();
    CheckHttp();
  }
  return failures == 0 ? 0 : 1;
}
