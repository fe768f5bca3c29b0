// Reading a response's head.
#define TW_LOG_SOURCE "twhttp"

#include <exception>

#include "tarnwick/http/head_parser.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/request_settings.h"
#include "tarnwick/platform/text_view.h"

using namespace tarnwick;

namespace {

constexpr int kLineSize = 2048;
constexpr int kMaxHeaderLines = 30;

int ResultFromStatus(int status) {
  if (status >= 200 && status <= 299) return HTTP_RET_OK;
  if (status == 401) return HTTP_RET_UNAUTHORIZED;
  if (status == 414) return HTTP_RET_URI_TOO_LONG;
  if (status == 302) return HTTP_RET_REDIRECT;
  return HTTP_RET_BAD_RESPONSE;
}

}  // namespace

int TWHttpClient::CheckHttpResponse() try {
  m_statusCode = 0;
  if (m_connState != 1) return HTTP_RET_NOT_READY;
  char line[kLineSize];
  if (ReadToLineEnd(line, kLineSize) < 0) return HTTP_RET_IO_ERROR;
  const StatusLine parsed = ParseStatusLine(line, &m_statusCode);
  if (parsed == StatusLine::kIncomplete) return HTTP_RET_IO_ERROR;
  if (parsed == StatusLine::kNotHttp) return HTTP_RET_BAD_RESPONSE;
  const int result = CheckContentType();
  return result != HTTP_RET_OK ? result : ResultFromStatus(m_statusCode);
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

int TWHttpClient::CheckContentType() try {
  m_mapContent.clear();
  m_strCookie.clear();
  m_strAuthenticate.clear();
  // The transfer encoding of an earlier response stays, and the next body is decoded by it. Kept as
  // it is: callers may depend on it; pinned by
  // ReadBody.ATransferEncodingStaysForALaterResponseWithoutOne.
  for (int count = 0; count < kMaxHeaderLines; ++count) {
    char line[kLineSize];
    const int length = ReadToLineEnd(line, kLineSize);
    if (length < 0) {
      TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "Connect failed!\n\n");
      return HTTP_RET_IO_ERROR;
    }
    if (length == 0) break;
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG3, "%s\n", tarnwick::PeerText(line).Get());
    if (!StoreHeader(line)) return HTTP_RET_NOT_READY;
  }
  // Lines beyond the last allowed one are left in front of the body.
  m_connState = 2;
  return HTTP_RET_OK;
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}

// Results: false for a line without a name, and for a kept field without a value.
bool TWHttpClient::StoreHeader(const char* line) {
  const HeaderLine parsed = ParseHeaderLine(line);
  if (!parsed.hasName) return false;
  if (parsed.field == nullptr) return true;
  if (parsed.value.empty()) return false;
  switch (parsed.field->as) {
    case KeptAs::kContent:
      m_mapContent.try_emplace(parsed.field->key, Trim(parsed.value, " "));
      break;
    case KeptAs::kCookie:
      m_strCookie = ParseCookie(parsed.value);
      break;
    case KeptAs::kChallenge:
      m_strAuthenticate = parsed.value;
      break;
    case KeptAs::kTransferEncoding:
      m_strTransferEncoding = Trim(parsed.value, " ");
      break;
  }
  return true;
}
