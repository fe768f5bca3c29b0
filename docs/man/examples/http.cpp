// The examples at the head of tarnwick/http/twhttp.h, to the letter.
#include <json/json.h>

#include "docs/man/examples/examples.h"
#include "tarnwick/http/twhttp.h"

int CameraNumber(const std::string& host, int port) {
  Json::Value response;
  int result = SendHttpGet(host, port, "api/info?full=1", response, 5, false);  // 0: success
  return result == 0 ? response["camera"].asInt() : -1;
}

std::string InfoPage(const std::string& host, int port) {
  // At most 5 seconds a wait, with read-ahead; the login goes out when the device asks for it.
  TWHttpClient client(host, port, "info.cgi", "admin", "secret", /*timeout=*/5, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_NONE, /*encodeKeep=*/"");
  int status = 0;
  std::string body;
  if (client.SendRequest(HTTP_METHOD_GET, "") != HTTP_RET_OK) return "";  // not sent
  if (client.CheckResponse(status) != HTTP_RET_OK) return "";             // `status` tells more
  if (client.ReadBody(body) != HTTP_RET_OK) return "";                    // it broke off
  return body;
}
