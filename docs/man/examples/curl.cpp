// tarnwick_curl(3): a request of one's own.
#include <memory>

#include "docs/man/examples/examples.h"
#include "tarnwick/http/twcurl.h"

long StatusOf(const std::string& url) {
  const std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> curl(TWCurlInit(), &curl_easy_cleanup);
  if (curl == nullptr) return -1;
  curl_easy_setopt(curl.get(), CURLOPT_URL, url.c_str());
  curl_easy_setopt(curl.get(), CURLOPT_NOBODY, 1L);
  curl_easy_setopt(curl.get(), CURLOPT_TIMEOUT, 5L);
  curl_easy_setopt(curl.get(), CURLOPT_NOSIGNAL, 1L);
  long status = -1;
  if (curl_easy_perform(curl.get()) == CURLE_OK) {
    curl_easy_getinfo(curl.get(), CURLINFO_RESPONSE_CODE, &status);
  }
  return status;
}
