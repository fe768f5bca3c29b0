// libcurl's global state and its handles.
#ifndef TARNWICK_HTTP_TWCURL_H_
#define TARNWICK_HTTP_TWCURL_H_

#include <curl/curl.h>

#include "tarnwick/platform/export.h"

// A new libcurl easy handle; the first call initialises libcurl for the process, which nothing
// undoes. The library's own requests go through it as well.
//
// Results: the handle, which the caller releases with curl_easy_cleanup; null when libcurl gave
//   none. After a failed initialisation the next call tries again.
// Logs: a failed initialisation, in category http at error, as source twcurl: "Failed to global
//   init curl with res [N]."
// Threads: any; waits while another one initialises.
TARNWICK_API CURL* TWCurlInit();

#endif  // TARNWICK_HTTP_TWCURL_H_
