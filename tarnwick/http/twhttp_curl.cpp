// One request through libcurl, as the one-call functions and file downloads need it.
#define TW_LOG_SOURCE "twhttp"

#include <cstdio>
#include <exception>

#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/http/curl_request.h"
#include "tarnwick/http/request_parts.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

namespace {

constexpr char kSendRequestByCurl[] = "SendRequestByCurl";

// libcurl before 7.62 has this name for another code.
constexpr CURLcode kCertificateNotVerified = CURLE_PEER_FAILED_VERIFICATION;
static_assert(kCertificateNotVerified == 60, "HTTP_RET_CERT_ERROR is told by this code");

// Results: true for CURLE_OK; any other code is logged.
bool Accept(CURLcode code, const char* func = kSendRequestByCurl) {
  if (code == CURLE_OK) return true;
  TW_LOG_AS(func, LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "CURL Error(%d): %s\n", code,
            curl_easy_strerror(code));
  return false;
}

bool SetCurlSSLOpt(CurlRequest* curl) {
  CURLcode code = curl->Set(CURLOPT_SSL_VERIFYPEER, 0L);
  if (code != CURLE_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Failed to set CURLOPT_SSL_VERIFYPEER\n");
    return Accept(code, __func__);
  }
  code = curl->Set(CURLOPT_SSL_VERIFYHOST, 0L);
  if (code != CURLE_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Failed to set CURLOPT_SSL_VERIFYHOST\n");
  }
  return Accept(code, __func__);
}

bool SetCurlCallbackOpt(CurlRequest* curl, std::string* text) {
  CURLcode code = curl->Set(CURLOPT_WRITEFUNCTION, CurlStringWrite);
  if (code != CURLE_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Failed set CURLOPT_WRITEFUNCTION\n");
    return Accept(code, __func__);
  }
  code = curl->Set(CURLOPT_WRITEDATA, text);
  if (code != CURLE_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Failed to CURLOPT_WRITEDATA\n");
  }
  return Accept(code, __func__);
}

bool SetOutputFile(CurlRequest* curl, FILE* file) {
  return Accept(curl->Set(CURLOPT_HEADERFUNCTION, CurlHeaderToFile)) &&
         Accept(curl->Set(CURLOPT_HEADERDATA, file)) &&
         Accept(curl->Set(CURLOPT_WRITEFUNCTION, CurlFileWrite)) &&
         Accept(curl->Set(CURLOPT_WRITEDATA, file));
}

// Whether a transfer's own bytes have reached its file, if it has one. A full disk shows when stdio
// writes, which may be later than libcurl has handed over the bytes.
class FileWrites {
 public:
  explicit FileWrites(FILE* file) : m_file(file), m_failedBefore(file != nullptr && ferror(file)) {}

  // A flush of the header lines that failed shows in the error flag alone, and glibc has dropped
  // the bytes. A flag of before the transfer is the caller's: it tells nothing, and stays.
  bool Finish() const {
    if (m_file == nullptr) return true;
    if (fflush(m_file) == 0 && (m_failedBefore || ferror(m_file) == 0)) return true;
    return Accept(CURLE_WRITE_ERROR);
  }

 private:
  FILE* m_file;
  bool m_failedBefore;
};

bool AddHeader(CurlRequest* curl, const std::string& line) {
  return Accept(curl->AddHeader(line) ? CURLE_OK : CURLE_OUT_OF_MEMORY);
}

bool SetOutput(CurlRequest* curl, FILE* file, std::string* text) {
  return file != nullptr ? SetOutputFile(curl, file) : SetCurlCallbackOpt(curl, text);
}

// A GET asks for the path; anything else posts the path, which then is no part of the URL.
bool SetRequest(CurlRequest* curl, const RequestParts& parts, TW_HTTP_METHOD method, int timeout) {
  const bool get = method == HTTP_METHOD_GET;
  std::string url = (parts.https ? "https://" : "http://") + parts.host;
  if (get) url += (parts.host.empty() ? "" : "/") + parts.path;
  return Accept(curl->Set(CURLOPT_TIMEOUT, static_cast<long>(timeout))) &&
         Accept(curl->Set(CURLOPT_USERNAME, parts.user.c_str())) &&
         Accept(curl->Set(CURLOPT_PASSWORD, parts.password.c_str())) &&
         Accept(get ? curl->Set(CURLOPT_HTTPGET, 1L)
                    : curl->Set(CURLOPT_POSTFIELDS, parts.path.c_str())) &&
         Accept(curl->Set(CURLOPT_PORT, static_cast<long>(parts.port))) &&
         Accept(curl->Set(CURLOPT_URL, url.c_str())) &&
         Accept(curl->Set(CURLOPT_USERAGENT, "Quenrith Tarnwick"));
}

bool SetHeaders(CurlRequest* curl, const RequestParts& parts, TW_HTTP_METHOD method) {
  const std::string length = IntToString(static_cast<int64_t>(parts.path.size()));
  return AddHeader(curl, "Content-Type: application/x-www-form-urlencoded; charset=utf-8") &&
         AddHeader(curl, "Connection: close") &&
         (method != HTTP_METHOD_POST || AddHeader(curl, "Content-Length: " + length)) &&
         (parts.cookie.empty() || AddHeader(curl, "Cookie: " + parts.cookie)) &&
         Accept(curl->Set(CURLOPT_HTTPHEADER, curl->Headers()));
}

}  // namespace

int TWHttpClient::SendRequestByCurl(TW_HTTP_METHOD method, bool verifyPeer, int timeout) try {
  m_strCurlText.clear();
  CurlRequest curl(kSendRequestByCurl);
  if (!curl.Valid()) return HTTP_RET_IO_ERROR;
  m_result = HTTP_RET_IO_ERROR;
  if (!verifyPeer && !SetCurlSSLOpt(&curl)) return m_result;
  const RequestParts parts = Parts(m_strPath);
  if (!SetOutput(&curl, m_pCurlRespFile, &m_strCurlText) ||
      !SetRequest(&curl, parts, method, timeout) || !SetHeaders(&curl, parts, method)) {
    return m_result;
  }
  const FileWrites writes(m_pCurlRespFile);
  const CURLcode code = curl.Perform();
  if (code == kCertificateNotVerified) m_result = HTTP_RET_CERT_ERROR;
  if (code != CURLE_OK || !curl.StatusIsSuccess() || !writes.Finish()) return m_result;
  m_connState = 1;
  m_result = HTTP_RET_OK;
  return m_result;
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}
