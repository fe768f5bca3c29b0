// A POST through libcurl that logs in as the server asks and wants only the status.
#include <algorithm>
#include <exception>

#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/http/curl_options.h"

using namespace tarnwick;

namespace {

static_assert(HTTP_VERSION_NONE == static_cast<int>(CURL_HTTP_VERSION_NONE) &&
                  HTTP_VERSION_1_0 == static_cast<int>(CURL_HTTP_VERSION_1_0) &&
                  HTTP_VERSION_1_1 == static_cast<int>(CURL_HTTP_VERSION_1_1),
              "the versions go to libcurl as they are");

bool SetVersion(CurlRequest* curl, HTTP_VERSION version) {
  if (version != HTTP_VERSION_1_0 && version != HTTP_VERSION_1_1) return true;
  return curl->Set(CURLOPT_HTTP_VERSION, static_cast<long>(version), "Failed to set http version");
}

}  // namespace

int TWHttpClient::SendRequestByPost(std::string separators) try {
  const RequestParts parts = Parts(m_strPath);
  std::string url;
  std::string body;
  return PerformByCurl(__func__, &m_result, &m_connState, [&](CurlRequest* curl) {
    const size_t separator = std::min(m_strPath.find_first_of(separators), m_strPath.size());
    url = PlainHostUrl(parts) + m_strPath.substr(0, separator);
    body = m_strPath.substr(std::min(separator + 1, m_strPath.size()));
    return SetCurlCredentials(curl, parts) && SetVersion(curl, m_httpVersion) &&
           curl->Set(CURLOPT_URL, url.c_str(), "Failed to set url=", url.c_str()) &&
           curl->Set(CURLOPT_POSTFIELDS, body.c_str(), "Failed to set POST field") &&
           SetCurlAuth(curl) &&
           curl->Set(CURLOPT_WRITEFUNCTION, CurlDiscardWrite, "Failed to set WRITEFUNCTION");
  });
} catch (const std::exception&) {  // memory ran out
  return HTTP_RET_IO_ERROR;
}
