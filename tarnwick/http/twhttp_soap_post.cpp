// SOAP POSTs over the client's socket: plain, with credentials, and with the response as XML.
#define TW_LOG_SOURCE "twhttp"

#include <algorithm>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>

#include "tarnwick/http/challenge_words.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/http/xml_response.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unique.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

namespace {

constexpr char kSendReqBySocketPost[] = "SendReqBySocketPost";

// A response up to this size is read with one call into one buffer. For a larger one memory grows
// with what arrives: a peer may announce any length.
constexpr int kInitialCapacity = 1 << 20;

int OutOfMemory(int64_t bytes) {
  TW_LOG_AS(kSendReqBySocketPost, LOG_CATEG_HTTP, LOG_LEVEL_ERROR,
            "Out of memory. Need %d bytes.\n", static_cast<int>(bytes));
  return HTTP_RET_IO_ERROR;
}

// The announced length; 0 when there is none, and when it is no length that a buffer can have.
int ToLength(const std::string& text) {
  const long long length = std::strtoll(text.c_str(), nullptr, 10);
  return length > 0 && length < INT_MAX ? static_cast<int>(length) : 0;
}

// The bytes of a response while they arrive, with room for a zero byte after them.
class ResponseBuffer {
 public:
  // Makes room for `size` bytes in all. Results: false when memory ran out; the bytes stay.
  bool Reserve(int size) {
    const size_t bytes = static_cast<size_t>(size) + 1;
    void* const grown = m_bytes ? std::realloc(m_bytes.get(), bytes) : std::malloc(bytes);
    if (grown == nullptr) return false;
    static_cast<void>(m_bytes.release());
    m_bytes.reset(static_cast<char*>(grown));
    return true;
  }

  char* End() { return m_bytes.get() + m_length; }
  void Added(int count) { m_length += count; }
  int Length() const { return m_length; }

  // The bytes up to the first zero byte.
  const char* Text() {
    *End() = '\0';
    return m_bytes.get();
  }

 private:
  UniqueMalloc<char> m_bytes;
  int m_length = 0;
};

}  // namespace

int TWHttpClient::SendReqBySocketPost(const std::string& body, std::string& response) try {
  if (body.empty()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Empty msg.\n");
    return HTTP_RET_IO_ERROR;
  }
  if (!Reconnect()) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Connection failed!\n\n");
    return HTTP_RET_IO_ERROR;
  }
  if (WriteSoapPost(BuildSoapPost(body)) != HTTP_RET_OK) return HTTP_RET_IO_ERROR;
  m_connState = 1;
  m_result = CheckHttpResponse();
  std::string length;
  GetHttpContent(HTTP_CONTENT_LENGTH, length);
  return ReadSoapResponse(ToLength(length), &response);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

// The stored authorization is for one request and is gone afterwards.
std::string TWHttpClient::BuildSoapPost(const std::string& body) {
  std::string request = "POST /" + m_strPath + " HTTP/1.1\r\n";
  request += "Host: " + m_strHost + "\r\n";
  request += "Content-Type: application/soap+xml; charset=utf-8\r\n";
  if (!m_strAuthorization.empty()) request += m_strAuthorization + "\r\n";
  m_strAuthorization.clear();
  request += "Content-Length: " + IntToString(static_cast<int64_t>(body.size())) + "\r\n";
  request += "\r\n";
  request += body;
  return request;
}

int TWHttpClient::WriteSoapPost(const std::string& request) {
  const size_t size = request.size();
  if (size >= INT_MAX) return OutOfMemory(INT_MAX);
  const UniqueMalloc<char> text(static_cast<char*>(std::malloc(size + 1)));
  if (!text) return OutOfMemory(static_cast<int64_t>(size) + 1);
  // The request is text: what follows a zero byte is sent as zero bytes.
  std::strncpy(text.get(), request.c_str(), size + 1);
  if (m_pSocket->WriteData(text.get(), static_cast<int>(size)) > 0) return HTTP_RET_OK;
  TW_LOG_AS(kSendReqBySocketPost, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Write data faild.\n");
  return HTTP_RET_IO_ERROR;
}

// Reads the `length` bytes of a response, or what comes of them: a read that delivers less ends it.
int TWHttpClient::ReadSoapResponse(int length, std::string* response) {
  if (length == 0) return HTTP_RET_IO_ERROR;
  ResponseBuffer buffer;
  for (int room = std::min(length, kInitialCapacity); buffer.Length() < length;
       room = std::min(length - buffer.Length(), buffer.Length())) {
    if (!buffer.Reserve(buffer.Length() + room)) return OutOfMemory(int64_t{length} + 1);
    const int count = m_pSocket->ReadData(buffer.End(), room);
    if (count > 0) buffer.Added(count);
    if (count < room) break;
  }
  if (buffer.Length() == 0) {
    TW_LOG_AS(kSendReqBySocketPost, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Read data faild.\n");
    return HTTP_RET_IO_ERROR;
  }
  *response = buffer.Text();
  return HTTP_RET_OK;
}

int TWHttpClient::SendAuthReqBySocketPost(const std::string& body, std::string& response) try {
  int result = SendReqBySocketPost(body, response);
  // Asked of the last response, not of the result: a 401 without a body has failed above.
  if (m_result == HTTP_RET_UNAUTHORIZED) {
    if (ContainsIgnoreCase(m_strAuthenticate, "digest")) {
      m_strAuthorization = GenDigestAccessAuth("POST", "");
      result = SendReqBySocketPost(body, response);
    } else if (ContainsIgnoreCase(m_strAuthenticate, "basic")) {
      m_strAuthorization = GenBasicAccessAuth();
      result = SendReqBySocketPost(body, response);
    }
  }
  if (result != HTTP_RET_OK) return result;
  int status = 0;
  return CheckResponse(status);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendReqByXMLSocketPost(std::string body, xmlDoc*& doc) try {
  std::string response;
  const int result = SendReqBySocketPost(body, response);
  if (result != HTTP_RET_OK) return result;
  // All CR and LF are removed, those inside values too. Kept as it is: callers may depend on it;
  // pinned by SendReqByXMLSocketPost.CarriageReturnsAndLineFeedsAreRemovedEverywhere.
  RemoveChar(response, '\r');
  RemoveChar(response, '\n');
  doc = ParseXml(response.data(), static_cast<int>(response.size()));
  return result;
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}
