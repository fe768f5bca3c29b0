// SOAP POSTs over the client's socket: plain, with credentials, and with the response as XML.
#define TW_LOG_SOURCE "twhttp"

#include <algorithm>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>

#include "tarnwick/http/request_text.h"
#include "tarnwick/http/xml_response.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/text_view.h"
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
  const int length = ToInt(text);
  return length > 0 && length < INT_MAX ? length : 0;
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

int WriteRequest(TWSocket* socket, const std::string& request) {
  const size_t size = request.size();
  if (size >= INT_MAX) return OutOfMemory(INT_MAX);
  const UniqueMalloc<char> text(static_cast<char*>(std::malloc(size + 1)));
  if (!text) return OutOfMemory(static_cast<int64_t>(size) + 1);
  // The request is text: what follows a zero byte is sent as zero bytes.
  std::strncpy(text.get(), request.c_str(), size + 1);
  if (socket->WriteData(text.get(), static_cast<int>(size)) > 0) return HTTP_RET_OK;
  TW_LOG_AS(kSendReqBySocketPost, LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Write data faild.\n");
  return HTTP_RET_IO_ERROR;
}

// Reads the `length` bytes of a response, or what comes of them: a read that delivers less ends it.
int ReadResponse(TWSocket* socket, int length, std::string* response) {
  if (length == 0) return HTTP_RET_IO_ERROR;
  ResponseBuffer buffer;
  for (int room = std::min(length, kInitialCapacity); buffer.Length() < length;
       room = std::min(length - buffer.Length(), buffer.Length())) {
    if (!buffer.Reserve(buffer.Length() + room)) return OutOfMemory(int64_t{length} + 1);
    const int count = socket->ReadData(buffer.End(), room);
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
  const std::string request = SoapPostRequest(Parts(m_strPath), body);
  m_strAuthorization.clear();  // it is for one request
  if (WriteRequest(m_pSocket, request) != HTTP_RET_OK) return HTTP_RET_IO_ERROR;
  m_connState = 1;
  m_result = CheckHttpResponse();
  std::string length;
  GetHttpContent(HTTP_CONTENT_LENGTH, length);
  return ReadResponse(m_pSocket, ToLength(length), &response);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::SendAuthReqBySocketPost(const std::string& body, std::string& response) try {
  int result = SendReqBySocketPost(body, response);
  // m_result, not `result`: a 401 without a body makes SendReqBySocketPost fail.
  if (m_result == HTTP_RET_UNAUTHORIZED && Authorize("POST")) {
    result = SendReqBySocketPost(body, response);
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
