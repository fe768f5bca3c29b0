// One request through libcurl: a handle and a header list of its own, released together. Nothing
// survives from one request to the next.
#ifndef TARNWICK_HTTP_CURL_REQUEST_H_
#define TARNWICK_HTTP_CURL_REQUEST_H_

#include <curl/curl.h>

#include <string>

#include "tarnwick/platform/cancel.h"

namespace tarnwick {

// It logs under the name of the operation that it serves.
class CurlRequest {
 public:
  // A missing handle is logged. REQUIRES: `operation` outlives the object.
  explicit CurlRequest(const char* operation);
  ~CurlRequest();
  CurlRequest(const CurlRequest&) = delete;
  CurlRequest& operator=(const CurlRequest&) = delete;

  bool Valid() const { return m_curl != nullptr; }

  // Sets an option. Results: libcurl's code.
  template <typename T>
  CURLcode Set(CURLoption option, T value) {
    return curl_easy_setopt(m_curl, option, value);
  }

  // Sets an option; a refusal is logged at debug as `message` and `detail` with libcurl's code.
  // Results: false after a refusal.
  template <typename T>
  bool Set(CURLoption option, T value, const char* message, const char* detail = "") {
    return Accept(Set(option, value), message, detail);
  }

  // Adds a line to the header list. Results: false when memory ran out.
  bool AddHeader(const std::string& line);

  // The same; a failure is logged at debug as `message` with libcurl's code for it.
  bool AddHeader(const std::string& line, const char* message) {
    return Accept(AddHeader(line) ? CURLE_OK : CURLE_OUT_OF_MEMORY, message, "");
  }

  struct curl_slist* Headers() const {
    return m_headers;
  }

  // Performs the transfer. Results: libcurl's code; a failure is logged. The signal handlers of the
  // process and the mask of the thread stay as they are.
  CURLcode Perform();

  // The status of the response was from 200 to 299; any other is logged.
  bool StatusIsSuccess();

 private:
  CURLcode SetOwnOptions();
  bool Accept(CURLcode code, const char* message, const char* detail);

  NoCancel m_noCancel;  // libcurl is not left in the middle
  const char* m_operation;
  CURL* m_curl;
  struct curl_slist* m_headers;
};

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_CURL_REQUEST_H_
