// XML REST requests through libcurl, and their responses.
#define TW_LOG_SOURCE "twhttp"

#include <fcntl.h>
#include <libxml/tree.h>

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <exception>

#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/http/curl_request.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/http/xml_response.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unique.h"

using namespace tarnwick;

namespace {

// A longer document is cut to one character less. Kept as it is: callers may depend on it; pinned
// by SendReqByXMLPost.OfADocumentOf10000BytesTheFirst8191AreSent.
constexpr size_t kMaxPostBody = 8192;

struct XmlDeleter {
  void operator()(xmlChar* text) const { xmlFree(text); }
};

// The document as indented text, cut to the buffer. Results: false when it cannot be serialised.
bool SerialiseXml(xmlDoc* doc, char (&body)[kMaxPostBody]) {
  xmlChar* text = nullptr;
  int length = 0;
  if (doc != nullptr) xmlDocDumpFormatMemory(doc, &text, &length, 1);
  const std::unique_ptr<xmlChar, XmlDeleter> owner(text);
  if (text == nullptr) return false;
  snprintf(body, sizeof(body), "%s", reinterpret_cast<const char*>(text));
  return true;
}

UniqueFile OpenTemporaryFile() {
  UniqueFile file(tmpfile());
  if (file) fcntl(fileno(file.get()), F_SETFD, FD_CLOEXEC);
  return file;
}

constexpr char kSetFile[] = "Failed to set file";

}  // namespace

int TWHttpClient::SendReqByXMLGet(int timeout) try {
  CurlRequest curl(__func__);
  if (!curl.Valid()) return HTTP_RET_IO_ERROR;
  m_result = HTTP_RET_IO_ERROR;
  if (!curl.Set(CURLOPT_TIMEOUT, static_cast<long>(timeout), "Failed to set timeout") ||
      !SetCurlCredentials(&curl) || !SetXmlUrl(&curl) ||
      !curl.Set(CURLOPT_HTTPAUTH, CURLAUTH_BASIC | CURLAUTH_DIGEST, "Failed to set auth") ||
      !SetXmlWriter(&curl) || !SetXmlOutput(&curl, kSetFile)) {
    return m_result;
  }
  return PerformByCurl(&curl);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendReqByXMLPost(xmlDoc*& doc) try {
  char body[kMaxPostBody];
  if (!SerialiseXml(doc, body)) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Empty xml document\n");
    return HTTP_RET_IO_ERROR;
  }
  CurlRequest curl(__func__);
  if (!curl.Valid()) return HTTP_RET_IO_ERROR;
  m_result = HTTP_RET_IO_ERROR;
  if (!SetCurlCredentials(&curl) || !SetXmlUrl(&curl) || !SetXmlHeaders(&curl, false) ||
      !curl.Set(CURLOPT_POSTFIELDS, body, "Failed to set POST field") || !SetXmlWriter(&curl) ||
      !SetXmlOutput(&curl, kSetFile)) {
    return m_result;
  }
  return PerformByCurl(&curl);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendReqByXMLPut(xmlDoc*& doc) try {
  CurlRequest curl(__func__);
  if (!curl.Valid()) return HTTP_RET_IO_ERROR;
  m_result = HTTP_RET_IO_ERROR;
  if (!SetCurlCredentials(&curl) || !SetXmlUrl(&curl) || !SetXmlHeaders(&curl, true) ||
      !curl.Set(CURLOPT_READFUNCTION, CurlFileRead, "Failed to set READFUNCTION") ||
      !SetXmlWriter(&curl) || !SetCurlPut(&curl)) {
    return m_result;
  }
  if (doc == nullptr) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Empty XML document\n");
    return m_result;
  }
  const UniqueFile file = OpenTemporaryFile();
  if (!file) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Failed to fopen temp file\n");
    return m_result;
  }
  return PutXmlFile(&curl, doc, file.get());
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

// REQUIRES: `file` is open for writing and reading.
int TWHttpClient::PutXmlFile(CurlRequest* curl, xmlDoc* doc, FILE* file) {
  const int size = xmlDocDump(file, doc);
  if (size < 0) {
    TW_LOG_AS("SendReqByXMLPut", LOG_CATEG_HTTP, LOG_LEVEL_DEBUG,
              "Failed to write xml document to temp file\n");
    return m_result;
  }
  rewind(file);
  if (!curl->Set(CURLOPT_READDATA, file, kSetFile) ||
      !curl->Set(CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(size),
                 "Failed to set file size") ||
      !SetXmlOutput(curl, kSetFile)) {
    return m_result;
  }
  return PerformByCurl(curl);
}

int TWHttpClient::SendReqByXMLDelete() try {
  CurlRequest curl(__func__);
  if (!curl.Valid()) return HTTP_RET_IO_ERROR;
  m_result = HTTP_RET_IO_ERROR;
  if (!SetCurlCredentials(&curl) || !SetXmlUrl(&curl) ||
      !curl.Set(CURLOPT_CUSTOMREQUEST, "DELETE", "Failed to setopt") || !SetXmlWriter(&curl) ||
      !SetXmlOutput(&curl, "Failed to set WRITEDATA")) {
    return m_result;
  }
  return PerformByCurl(&curl);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

bool TWHttpClient::GetResponseXML(xmlDoc*& doc) {
  const UniqueMalloc<char> text(m_pRespBuf);
  if (!text) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Empty xml response\n");
    return false;
  }
  const bool fits = m_respLen <= INT_MAX;
  doc = fits ? ParseXml(text.get(), static_cast<int>(m_respLen)) : nullptr;
  m_pRespBuf = nullptr;
  m_respLen = 0;
  if (doc != nullptr) return true;
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Failed to parse response to XML\n");
  return false;
}

// Without a host the path is not used either.
bool TWHttpClient::SetXmlUrl(CurlRequest* curl) {
  const std::string url = m_strHost.empty() ? PlainHostUrl() : PlainHostUrl() + m_strPath;
  return curl->Set(CURLOPT_URL, url.c_str(), "Failed to set url=", url.c_str());
}

bool TWHttpClient::SetXmlHeaders(CurlRequest* curl, bool forUpload) {
  // It speaks of the request, not of the headers. Messages are never reworded; pinned by
  // XmlSenders.EachRefusedOptionHasItsLineAndEndsTheRequest.
  constexpr char kFailed[] = "Failed to set custom request";
  // The empty Expect keeps libcurl from waiting a second for a 100 (Continue), RFC 7231, 5.1.1.
  return curl->AddHeader("Accept: */*", kFailed) &&
         curl->AddHeader("Content-Type: application/xml; charset=UTF-8", kFailed) &&
         (!forUpload || curl->AddHeader("Expect:", kFailed)) &&
         curl->Set(CURLOPT_HTTPHEADER, curl->Headers(), kFailed);
}

bool TWHttpClient::SetCurlPut(CurlRequest* curl) {
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
  // CURLOPT_PUT is deprecated since libcurl 7.12.1, and still set; pinned by
  // XmlSenders.TheOptionsAreSetInOrder.
  return curl->Set(CURLOPT_UPLOAD, 1L, "Failed to set upload=", "1") &&
         curl->Set(CURLOPT_PUT, 1L, "Failed to set put=", "1");
#pragma GCC diagnostic pop
}

bool TWHttpClient::SetXmlWriter(CurlRequest* curl) {
  return curl->Set(CURLOPT_WRITEFUNCTION, CurlBufferWrite, "Failed to set WRITEFUNCTION");
}

// The response's body goes after what an earlier request has left; pinned by
// GetResponseXML.TwoGetsInARowLeaveBothBodiesWhichTogetherAreNoDocument. The two fields are side
// by side as a CurlMemBuffer does.
bool TWHttpClient::SetXmlOutput(CurlRequest* curl, const char* message) {
  return curl->Set(CURLOPT_WRITEDATA, reinterpret_cast<CurlMemBuffer*>(&m_pRespBuf), message);
}
