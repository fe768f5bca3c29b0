// Opening a streaming upload.
#define TW_LOG_SOURCE "twhttp"

#include <exception>

#include "tarnwick/http/request_text.h"
#include "tarnwick/log/twdebuglog.h"

using namespace tarnwick;

int TWHttpClient::OpenRawDataUpload() try {
  if (!Reconnect()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Connection failed!\n");
    return HTTP_RET_IO_ERROR;
  }
  const std::string head = UploadRequest(Parts(m_strPath));
  if (m_pSocket->WriteData(head.data(), static_cast<int>(head.size())) <= 0) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Write data faild.\n");
    return HTTP_RET_IO_ERROR;
  }
  m_connState = 2;  // opens WriteData for the caller's pieces
  return HTTP_RET_OK;
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}
