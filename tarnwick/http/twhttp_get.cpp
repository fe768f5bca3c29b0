// GET over the client's socket, and SendRequest, which chooses the transport by the method.
#define TW_LOG_SOURCE "twhttp"

#include <cstring>
#include <exception>

#include "tarnwick/http/query_encoding.h"
#include "tarnwick/http/request_text.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"

using namespace tarnwick;

namespace {

// Longer requests are cut there. Kept as it is: callers may depend on it; pinned by
// SendRequestByGet.ARequestOfMoreThan2047BytesIsCutThereAndIsTakenForSent.
constexpr size_t kMaxRequest = 2047;

}  // namespace

int TWHttpClient::SendRequestByGet() try {
  if (!Reconnect()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Connection failed!\n");
    return HTTP_RET_IO_ERROR;
  }
  const std::string path =
      m_bEncodeQuery ? EncodeQueryValues(m_strPath, m_strEncodeKeep) : m_strPath;
  const std::string request = GetRequest(Parts(path));
  m_strAuthorization.clear();                                   // it is for one request
  const size_t length = strnlen(request.c_str(), kMaxRequest);  // a zero byte ends it as well
  if (m_pSocket->WriteData(request.c_str(), static_cast<int>(length)) <= 0) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Write data faild.\n");
    return HTTP_RET_IO_ERROR;
  }
  m_connState = 1;
  m_result = CheckHttpResponse();
  return HTTP_RET_OK;
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendRequest(TW_HTTP_METHOD method, std::string arg) try {
  if (method != HTTP_METHOD_GET) return SendRequestByPost(arg);
  if (m_bBasicAuth) m_strAuthorization = GenBasicAccessAuth();
  const int result = SendRequestByGet();
  if (m_result != HTTP_RET_UNAUTHORIZED || !Authorize("GET")) return result;
  return SendRequestByGet();
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}
