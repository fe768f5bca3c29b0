#include "tarnwick/http/request_text.h"

#include <string_view>

#include "tarnwick/utils/utils.h"

namespace tarnwick {

namespace {

// 128 GiB. Kept as it is: callers may depend on it; pinned by the tests of OpenRawDataUpload.
constexpr int64_t kUploadLength = int64_t{1} << 37;

// What a request has besides the client's own strings, at most: memory is allocated once.
constexpr size_t kFixedSize = 256;

// A request, written in the order in which it is sent.
class RequestText {
 public:
  RequestText(std::string_view method, const RequestParts& parts, bool http11,
              size_t bodySize = 0) {
    m_text.reserve(parts.path.size() + parts.host.size() + parts.cookie.size() +
                   parts.authorization.size() + bodySize + kFixedSize);
    m_text.append(method).append(" /").append(parts.path);
    m_text.append(http11 ? " HTTP/1.1\r\n" : " HTTP/1.0\r\n");
  }

  void Line(std::string_view line) { m_text.append(line).append("\r\n"); }

  void Field(std::string_view name, std::string_view value) {
    m_text.append(name).append(": ").append(value).append("\r\n");
  }

  void Length(int64_t length) { Field("Content-Length", IntToString(length)); }

  // The line that ends the head, and the body.
  std::string End(std::string_view body = {}) {
    m_text.append("\r\n").append(body);
    return std::move(m_text);
  }

 private:
  std::string m_text;
};

}  // namespace

// Without a preference the GET speaks HTTP/1.0: a server may not respond to that in chunks, and
// closes after the body (RFC 7230, 3.3.1 and 6.3).
std::string GetRequest(const RequestParts& parts) {
  const bool http11 = parts.version == HTTP_VERSION_1_1;
  RequestText request("GET", parts, http11);
  request.Field("User-Agent", "Quenrith Tarnwick");
  if (!parts.cookie.empty()) request.Field("Cookie", parts.cookie);
  if (!parts.authorization.empty()) request.Line(parts.authorization);
  if (http11) request.Field("Host", parts.host);
  return request.End();
}

// Without a preference the form POST speaks HTTP/1.1, unlike the GET. Kept as it is: callers may
// depend on it; pinned by
// SendRequestBySocketPost.Http11IsSentForNoneAndHttp11AndHttp10ForEveryOther.
std::string FormPostRequest(const RequestParts& parts, const std::string& content) {
  const bool http11 = parts.version == HTTP_VERSION_NONE || parts.version == HTTP_VERSION_1_1;
  RequestText request("POST", parts, http11, content.size());
  request.Field("Host", parts.host);
  if (!parts.cookie.empty()) request.Field("Cookie", parts.cookie);
  request.Field("Content-Type", "application/x-www-form-urlencoded; charset=utf-8");
  request.Length(static_cast<int64_t>(content.size()));
  // With a semicolon, which RFC 7230, 6.1, has not. Kept as it is: callers may depend on it; pinned
  // by SendRequestBySocketPost.WithoutAVersionItSendsHttp11WithHostTypeLengthAndClose.
  if (http11) request.Field("Connection", "close;");
  return request.End(content);
}

std::string SoapPostRequest(const RequestParts& parts, const std::string& body) {
  RequestText request("POST", parts, true, body.size());
  request.Field("Host", parts.host);
  request.Field("Content-Type", "application/soap+xml; charset=utf-8");
  if (!parts.authorization.empty()) request.Line(parts.authorization);
  request.Length(static_cast<int64_t>(body.size()));
  return request.End(body);
}

std::string UploadRequest(const RequestParts& parts) {
  RequestText request("POST", parts, true);
  request.Field("Host", parts.host + ":" + IntToString(parts.port));
  if (!parts.cookie.empty()) request.Field("Cookie", parts.cookie);
  request.Field("Content-Type",
                "multipart/form-data; boundary=-----------QUENMULTIPART_BOUNDARY-----------");
  request.Length(kUploadLength);
  // RFC 7230, 3.2.4, forbids a blank in front of the colon. Kept as it is: callers may depend on
  // it; pinned by OpenRawDataUpload.WithAnEmptyCookieTheHeadHasNoCookieLine.
  request.Line("Cache-Control :no-cache");
  request.Field("Connection", "keep-alive");
  return request.End();
}

}  // namespace tarnwick
