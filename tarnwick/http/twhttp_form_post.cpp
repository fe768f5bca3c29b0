// A form POST over the client's socket.
#define TW_LOG_SOURCE "twhttp"

#include <algorithm>
#include <climits>
#include <exception>

#include "tarnwick/http/request_text.h"
#include "tarnwick/log/twdebuglog.h"

using namespace tarnwick;

int TWHttpClient::SendRequestBySocketPost(std::string content) try {
  if (!Reconnect()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_INFO,
           "Connection failed. host [%s:%d], path [%s], content [%s].\n", m_strHost.c_str(), m_port,
           m_strPath.c_str(), content.c_str());
    return HTTP_RET_IO_ERROR;
  }
  const std::string request = FormPostRequest(Parts(m_strPath), content);
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
