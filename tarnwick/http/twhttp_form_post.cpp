// A form POST over the client's socket.
#define TW_LOG_SOURCE "twhttp"

#include <algorithm>
#include <climits>
#include <exception>

#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/utils/utils.h"

int TWHttpClient::SendRequestBySocketPost(std::string content) try {
  if (!Reconnect()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_INFO,
           "Connection failed. host [%s:%d], path [%s], content [%s].\n", m_strHost.c_str(), m_port,
           m_strPath.c_str(), content.c_str());
    return HTTP_RET_IO_ERROR;
  }
  const std::string request = BuildFormPost(content);
  const int length = static_cast<int>(std::min<size_t>(request.size(), INT_MAX));
  const int written = m_pSocket->WriteData(request.data(), length);
  if (static_cast<size_t>(std::max(written, 0)) != request.size()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Write data faild, write %d/%d.\n", written, length);
    return HTTP_RET_IO_ERROR;
  }
  m_connState = 1;
  m_result = CheckHttpResponse();
  return HTTP_RET_OK;
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

std::string TWHttpClient::BuildFormPost(const std::string& content) const {
  // Without a preference the form POST speaks HTTP/1.1, unlike the GET. Kept as it is: callers may
  // depend on it; pinned by
  // SendRequestBySocketPost.Http11IsSentForNoneAndHttp11AndHttp10ForEveryOther.
  const bool http11 = m_httpVersion == HTTP_VERSION_NONE || m_httpVersion == HTTP_VERSION_1_1;
  std::string request = "POST /" + m_strPath + (http11 ? " HTTP/1.1\r\n" : " HTTP/1.0\r\n");
  request += "Host: " + m_strHost + "\r\n";
  if (!m_strCookie.empty()) request += "Cookie: " + m_strCookie + "\r\n";
  request += "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n";
  request += "Content-Length: " + IntToString(static_cast<int64_t>(content.size())) + "\r\n";
  // With a semicolon, which RFC 7230, 6.1, has not. Kept as it is: callers may depend on it; pinned
  // by SendRequestBySocketPost.WithoutAVersionItSendsHttp11WithHostTypeLengthAndClose.
  if (http11) request += "Connection: close;\r\n";
  request += "\r\n";
  request += content;
  return request;
}
