// tarnwick_scope(3): a device that cannot forge lines of the log.
#include <json/value.h>

#include "docs/man/examples/examples.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/net/twrequestscope.h"

int AskDevice(const std::string& host, int port) {
  TWRequestScope scope;
  scope.SetEscapedLog(true);
  if (!scope.Valid()) return -1;  // no memory: its lines would not be escaped
  Json::Value response;
  return SendHttpGet(host, port, "/info.json", response, 5, false);
}
