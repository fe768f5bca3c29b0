#define TW_LOG_SOURCE "twhttp"

#include "tarnwick/http/curl_request.h"

#include "tarnwick/http/twcurl.h"
#include "tarnwick/log/twdebuglog.h"

CurlRequest::CurlRequest(const char* operation)
    : m_operation(operation), m_curl(TWCurlInit()), m_headers(nullptr) {
  if (m_curl != nullptr) return;
  TW_LOG_AS(m_operation, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Failed to initial libcurl.\n");
}

CurlRequest::~CurlRequest() {
  if (m_curl != nullptr) curl_easy_cleanup(m_curl);
  curl_slist_free_all(m_headers);
}

bool CurlRequest::AddHeader(const std::string& line) {
  struct curl_slist* const longer = curl_slist_append(m_headers, line.c_str());
  if (longer != nullptr) m_headers = longer;
  return longer != nullptr;
}

CURLcode CurlRequest::Perform() {
  const CURLcode code = curl_easy_perform(m_curl);
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
