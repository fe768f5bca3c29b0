#define TW_LOG_SOURCE "twhttp"

#include "tarnwick/http/curl_request.h"

#include <sys/socket.h>

#include "tarnwick/http/twcurl.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/signal_guard.h"

namespace tarnwick {

namespace {

// Connections that programs started meanwhile do not inherit.
curl_socket_t OpenSocket(void* /*unused*/, curlsocktype /*purpose*/,
                         struct curl_sockaddr* address) {
  return socket(address->family, address->socktype | SOCK_CLOEXEC, address->protocol);
}

}  // namespace

CurlRequest::CurlRequest(const char* operation)
    : m_operation(operation), m_curl(TWCurlInit()), m_headers(nullptr) {
  if (m_curl != nullptr) return;
  TW_LOG_AS(m_operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Failed to initial libcurl.\n");
}

CurlRequest::~CurlRequest() {
  if (m_curl != nullptr) {
    SignalGuard guard(SIGPIPE);
    curl_easy_cleanup(m_curl);  // says goodbye to a TLS peer, who may be gone
    guard.DiscardPending();
  }
  curl_slist_free_all(m_headers);
}

bool CurlRequest::AddHeader(const std::string& line) {
  struct curl_slist* const longer = curl_slist_append(m_headers, line.c_str());
  if (longer != nullptr) m_headers = longer;
  return longer != nullptr;
}

// libcurl would else ignore SIGPIPE for the whole process while it works, and requests of several
// threads could leave that for good. And it would keep the TLS session for a next request of the
// handle, which there is never: version 7.88 frees a name twice when memory runs out in doing so.
// And it would ask again without an end where a peer calls each nonce stale; version 8.3 has made
// kMostRepeats its own default. Pinned by
// SendRequestByPost.ANonceThatIsAlwaysStaleIsAskedFor30TimesAtMost.
CURLcode CurlRequest::SetOwnOptions() {
  constexpr long kMostRepeats = 30;
  CURLcode code = Set(CURLOPT_NOSIGNAL, 1L);
  if (code == CURLE_OK) code = Set(CURLOPT_MAXREDIRS, kMostRepeats);
  if (code == CURLE_OK) code = Set(CURLOPT_OPENSOCKETFUNCTION, OpenSocket);
  return code == CURLE_OK ? Set(CURLOPT_SSL_SESSIONID_CACHE, 0L) : code;
}

CURLcode CurlRequest::Perform() {
  CURLcode code = SetOwnOptions();
  if (code == CURLE_OK) {
    SignalGuard guard(SIGPIPE);
    code = curl_easy_perform(m_curl);
    guard.DiscardPending();
  }
  Accept(code, "Failed to make http connection", "");
  return code;
}

bool CurlRequest::StatusIsSuccess() {
  long status = 0;
  curl_easy_getinfo(m_curl, CURLINFO_RESPONSE_CODE, &status);  // leaves 0 when it fails
  if (status >= 200 && status <= 299) return true;
  TW_LOG_AS(m_operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG,
            "Failed to make http connection, response=%lu\n", static_cast<unsigned long>(status));
  return false;
}

bool CurlRequest::Accept(CURLcode code, const char* message, const char* detail) {
  if (code == CURLE_OK) return true;
  TW_LOG_AS(m_operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "%s%s, return value=%d\n", message,
            detail, code);
  return false;
}

}  // namespace tarnwick
