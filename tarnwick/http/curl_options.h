// Options that several requests through libcurl share. Each function returns false after a refusal,
// which is logged.
#ifndef TARNWICK_HTTP_CURL_OPTIONS_H_
#define TARNWICK_HTTP_CURL_OPTIONS_H_

#include <string>

#include "tarnwick/http/curl_request.h"
#include "tarnwick/http/request_parts.h"

namespace tarnwick {

// Scheme, host and port, up to the path. Never TLS.
std::string PlainHostUrl(const RequestParts& parts);

// The user and the password.
bool SetCurlCredentials(CurlRequest* curl, const RequestParts& parts);

// The server's choice of Basic and Digest.
bool SetCurlAuth(CurlRequest* curl);

// Sets the options of a request by `setOptions(CurlRequest*)`, which returns false after a refusal,
// and performs it. Once there is a handle the outcome is stored in `result`, and after a success
// `state` says that a request was written.
// Results: HTTP_RET_OK after a status from 200 to 299; else HTTP_RET_IO_ERROR.
template <typename SetOptions>
int PerformByCurl(const char* operation, int* result, int* state, SetOptions setOptions) {
  CurlRequest curl(operation);
  if (!curl.Valid()) return HTTP_RET_IO_ERROR;
  *result = HTTP_RET_IO_ERROR;
  if (!setOptions(&curl)) return *result;
  if (curl.Perform() != CURLE_OK || !curl.StatusIsSuccess()) return *result;
  *state = 1;
  *result = HTTP_RET_OK;
  return *result;
}

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_CURL_OPTIONS_H_
