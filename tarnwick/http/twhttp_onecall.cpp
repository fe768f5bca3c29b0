// The one-call functions for JSON services.
#define TW_LOG_SOURCE "twhttp"

#include <cerrno>
#include <exception>

#include "tarnwick/http/json_response.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/request_settings.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

namespace {

constexpr char kSendHttpGet[] = "SendHttpGet";

// Sends the request and checks its status.
bool Fetch(TWHttpClient* client) {
  const int sent = client->SendRequest(HTTP_METHOD_GET, "?");
  if (sent != HTTP_RET_OK) {
    TW_LOG_AS(kSendHttpGet, LOG_CATEG_HTTP, LOG_LEVEL_INFO, "Failed to send request: %d\n", sent);
    return false;
  }
  int status = 0;
  const int result = client->CheckResponse(status);
  if (result == HTTP_RET_OK) return true;
  TW_LOG_AS(kSendHttpGet, LOG_CATEG_HTTP, LOG_LEVEL_INFO, "Failed to check response[%d]: %d\n",
            status, result);
  return false;
}

bool ReadUntilClose(TWHttpClient* client, std::string* body) {
  char piece[8192];
  int count;
  while ((count = client->ReadData(piece, sizeof(piece))) > 0) {
    body->append(piece, static_cast<size_t>(count));
  }
  if (count == 0) return true;
  TW_LOG_AS(kSendHttpGet, LOG_CATEG_HTTP, LOG_LEVEL_INFO, "Failed to read data: %d\n", errno);
  return false;
}

}  // namespace

int SendHttpGet(const std::string& host, int port, std::string path, Json::Value& result,
                int timeout, bool encodeQuery) try {
  if (!encodeQuery) RemoveChar(path, '\n');
  TWHttpClient client(host, port, path, "", "", timeout, false, true, encodeQuery, true,
                      HTTP_VERSION_NONE, "");
  std::string body;
  if (!Fetch(&client) || !ReadUntilClose(&client, &body)) return -1;
  if (body.empty()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Read Buffer Error\n");
    return -1;
  }
  if (JsonParse(body, result) != 0) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Failed to parse json [%s].\n",
           tarnwick::PeerText(body.c_str()).Get());
    return -2;
  }
  return 0;
} catch (const std::exception&) {  // memory ran out
  return -1;
}

int SendHttpPost(const std::string& host, int port, const std::string& path,
                 const std::string& body, const std::string& cookie, int timeout) try {
  TWHttpClient client(host, port, path, "", "", timeout, false, true, true, true, HTTP_VERSION_NONE,
                      "");
  if (cookie.empty()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_WARN, "[Warning] Cannot set balnk cookie\n");
  } else {
    client.SetCookie(cookie);
  }
  if (client.SendRequestBySocketPost(body) != HTTP_RET_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Send HTTP Request Error\n");
    return -1;
  }
  return 0;
} catch (const std::exception&) {  // memory ran out
  return -1;
}

int SendHttpsGet(const std::string& host, int port, const std::string& path, Json::Value& result,
                 int timeout) try {
  TWHttpClient client(host, port, path, "", "", timeout, true, true, true, true, HTTP_VERSION_NONE,
                      "");
  const int sent = client.SendRequestByCurl(HTTP_METHOD_GET, true, timeout);
  if (sent != HTTP_RET_OK) return sent == HTTP_RET_CERT_ERROR ? -2 : -1;
  const std::string text = client.GetCurlText();
  if (JsonParse(text, result) != 0) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Failed to parse json. Result is [%s]\n",
           tarnwick::PeerText(text.c_str()).Get());
    return -3;
  }
  return 0;
} catch (const std::exception&) {  // memory ran out
  return -1;
}
