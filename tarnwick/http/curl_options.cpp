#include "tarnwick/http/curl_options.h"

#include "tarnwick/utils/utils.h"

namespace tarnwick {

std::string PlainHostUrl(const RequestParts& parts) {
  if (parts.host.empty()) return "http://";
  return "http://" + parts.host + ":" + IntToString(parts.port) + "/";
}

// The password is in the log. Kept as it is: callers may depend on the messages; pinned by
// SendRequestByPost.EachRefusedOptionHasItsLineAndEndsTheRequest.
bool SetCurlCredentials(CurlRequest* curl, const RequestParts& parts) {
  return curl->Set(CURLOPT_USERNAME, parts.user.c_str(),
                   "Failed to set Usr=", parts.user.c_str()) &&
         curl->Set(CURLOPT_PASSWORD, parts.password.c_str(),
                   "Failed to set Pwd=", parts.password.c_str());
}

bool SetCurlAuth(CurlRequest* curl) {
  return curl->Set(CURLOPT_HTTPAUTH, CURLAUTH_BASIC | CURLAUTH_DIGEST, "Failed to set auth");
}

}  // namespace tarnwick
