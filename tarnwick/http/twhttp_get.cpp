// GET over the client's socket, and the choice of the way by method.
#define TW_LOG_SOURCE "twhttp"

#include <cstring>
#include <exception>

#include "tarnwick/http/challenge_words.h"
#include "tarnwick/http/query_encoding.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"

using namespace tarnwick;

namespace {

// Longer requests are cut there. Kept as it is: callers may depend on it; pinned by
// SendRequestByGet.ARequestOfMoreThan2047BytesIsCutThereAndIsTakenForSent.
constexpr size_t kMaxRequest = 2047;

// At least what a GET has besides the client's texts.
constexpr size_t kFixedOverhead = 80;

}  // namespace

int TWHttpClient::SendRequestByGet() try {
  if (!Reconnect()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Connection failed!\n");
    return HTTP_RET_IO_ERROR;
  }
  const std::string request = BuildGetRequest();
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

// The stored authorization is for one request and is gone afterwards.
std::string TWHttpClient::BuildGetRequest() {
  const std::string path =
      m_bEncodeQuery ? EncodeQueryValues(m_strPath, m_strEncodeKeep) : m_strPath;
  // Without a preference the GET speaks HTTP/1.0: a server may not respond to that in chunks, and
  // closes after the body (RFC 7230, 3.3.1 and 6.3).
  const bool http11 = m_httpVersion == HTTP_VERSION_1_1;
  std::string request;
  request.reserve(path.size() + m_strCookie.size() + m_strAuthorization.size() + m_strHost.size() +
                  kFixedOverhead);
  request.append("GET /").append(path).append(http11 ? " HTTP/1.1\r\n" : " HTTP/1.0\r\n");
  request.append("User-Agent: Quenrith Tarnwick\r\n");
  if (!m_strCookie.empty()) request.append("Cookie: ").append(m_strCookie).append("\r\n");
  if (!m_strAuthorization.empty()) request.append(m_strAuthorization).append("\r\n");
  m_strAuthorization.clear();
  if (http11) request.append("Host: ").append(m_strHost).append("\r\n");
  request.append("\r\n");
  return request;
}

int TWHttpClient::SendRequest(TW_HTTP_METHOD method, std::string arg) try {
  if (method != HTTP_METHOD_GET) return SendRequestByPost(arg);
  if (m_bBasicAuth) m_strAuthorization = GenBasicAccessAuth();
  const int result = SendRequestByGet();
  if (m_result != HTTP_RET_UNAUTHORIZED) return result;
  if (ContainsIgnoreCase(m_strAuthenticate, "digest")) {
    m_strAuthorization = GenDigestAccessAuth("GET", "");
    return SendRequestByGet();
  }
  if (ContainsIgnoreCase(m_strAuthenticate, "basic")) {
    m_strAuthorization = GenBasicAccessAuth();
    return SendRequestByGet();
  }
  return result;
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}
