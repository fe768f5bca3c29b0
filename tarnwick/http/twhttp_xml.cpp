// XML REST requests through libcurl, and their responses.
#define TW_LOG_SOURCE "twhttp"

#include <fcntl.h>
#include <libxml/tree.h>

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <exception>

#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/http/curl_options.h"
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

// Without a host the path is not used either.
bool SetTarget(CurlRequest* curl, const RequestParts& parts) {
  const std::string host = PlainHostUrl(parts);
  const std::string url = parts.host.empty() ? host : host + parts.path;
  return SetCurlCredentials(curl, parts) &&
         curl->Set(CURLOPT_URL, url.c_str(), "Failed to set url=", url.c_str());
}

bool SetHeaders(CurlRequest* curl, bool forUpload) {
  // It speaks of the request, not of the headers. Messages are never reworded; pinned by
  // XmlSenders.EachRefusedOptionHasItsLineAndEndsTheRequest.
  constexpr char kFailed[] = "Failed to set custom request";
  // The empty Expect keeps libcurl from waiting a second for a 100 (Continue), RFC 7231, 5.1.1.
  return curl->AddHeader("Accept: */*", kFailed) &&
         curl->AddHeader("Content-Type: application/xml; charset=UTF-8", kFailed) &&
         (!forUpload || curl->AddHeader("Expect:", kFailed)) &&
         curl->Set(CURLOPT_HTTPHEADER, curl->Headers(), kFailed);
}

bool SetPut(CurlRequest* curl) {
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
  // CURLOPT_PUT is deprecated since libcurl 7.12.1, and still set; pinned by
  // XmlSenders.TheOptionsAreSetInOrder.
  return curl->Set(CURLOPT_UPLOAD, 1L, "Failed to set upload=", "1") &&
         curl->Set(CURLOPT_PUT, 1L, "Failed to set put=", "1");
#pragma GCC diagnostic pop
}

bool SetWriter(CurlRequest* curl) {
  return curl->Set(CURLOPT_WRITEFUNCTION, CurlBufferWrite, "Failed to set WRITEFUNCTION");
}

// m_pRespBuf and m_respLen, which lie side by side.
CurlMemBuffer* CollectedBody(char** data) {
  return reinterpret_cast<CurlMemBuffer*>(data);
}

// The response's body goes after what an earlier request has left; pinned by
// GetResponseXML.TwoGetsInARowLeaveBothBodiesWhichTogetherAreNoDocument.
bool SetOutput(CurlRequest* curl, CurlMemBuffer* body, const char* message = kSetFile) {
  return curl->Set(CURLOPT_WRITEDATA, body, message);
}
int Failed(const char* what) {
  TW_LOG_AS("SendReqByXMLPut", LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "%s\n", what);
  return -1;
}

// Writes the document to `file`, a temporary one, for libcurl to read. Results: the document's size
// in bytes; -1 after a failure, which is logged.
int WriteDocument(xmlDoc* doc, UniqueFile* file) {
  if (doc == nullptr) return Failed("Empty XML document");
  *file = OpenTemporaryFile();
  if (!*file) return Failed("Failed to fopen temp file");
  const int size = xmlDocDump(file->get(), doc);
  if (size < 0) return Failed("Failed to write xml document to temp file");
  rewind(file->get());
  return size;
}

bool SetInput(CurlRequest* curl, FILE* file, int size) {
  return curl->Set(CURLOPT_READDATA, file, kSetFile) &&
         curl->Set(CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(size),
                   "Failed to set file size");
}

}  // namespace

int TWHttpClient::SendReqByXMLGet(int timeout) try {
  const RequestParts parts = Parts(m_strPath);
  return PerformByCurl(__func__, &m_result, &m_connState, [&](CurlRequest* curl) {
    return curl->Set(CURLOPT_TIMEOUT, static_cast<long>(timeout), "Failed to set timeout") &&
           SetTarget(curl, parts) && SetCurlAuth(curl) && SetWriter(curl) &&
           SetOutput(curl, CollectedBody(&m_pRespBuf));
  });
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendReqByXMLPost(xmlDoc*& doc) try {
  char body[kMaxPostBody];
  if (!SerialiseXml(doc, body)) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Empty xml document\n");
    return HTTP_RET_IO_ERROR;
  }
  const RequestParts parts = Parts(m_strPath);
  return PerformByCurl(__func__, &m_result, &m_connState, [&](CurlRequest* curl) {
    return SetTarget(curl, parts) && SetHeaders(curl, false) &&
           curl->Set(CURLOPT_POSTFIELDS, body, "Failed to set POST field") && SetWriter(curl) &&
           SetOutput(curl, CollectedBody(&m_pRespBuf));
  });
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendReqByXMLPut(xmlDoc*& doc) try {
  const RequestParts parts = Parts(m_strPath);
  UniqueFile file;
  return PerformByCurl(__func__, &m_result, &m_connState, [&](CurlRequest* curl) {
    if (!SetTarget(curl, parts) || !SetHeaders(curl, true) ||
        !curl->Set(CURLOPT_READFUNCTION, CurlFileRead, "Failed to set READFUNCTION") ||
        !SetWriter(curl) || !SetPut(curl)) {
      return false;
    }
    const int size = WriteDocument(doc, &file);
    return size >= 0 && SetInput(curl, file.get(), size) &&
           SetOutput(curl, CollectedBody(&m_pRespBuf));
  });
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendReqByXMLDelete() try {
  const RequestParts parts = Parts(m_strPath);
  return PerformByCurl(__func__, &m_result, &m_connState, [&](CurlRequest* curl) {
    return SetTarget(curl, parts) &&
           curl->Set(CURLOPT_CUSTOMREQUEST, "DELETE", "Failed to setopt") && SetWriter(curl) &&
           SetOutput(curl, CollectedBody(&m_pRespBuf), "Failed to set WRITEDATA");
  });
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
