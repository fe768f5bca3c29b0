// libcurl's global state and its handles.
#ifndef TARNWICK_HTTP_TWCURL_H_
#define TARNWICK_HTTP_TWCURL_H_

#include <curl/curl.h>

#include "tarnwick/platform/export.h"

// A new libcurl easy handle; the first call initialises libcurl for the process, which nothing
// undoes.
//
// Results: the handle, which the caller releases with curl_easy_cleanup; null when libcurl gave
//   none. A failed initialisation is logged (category http, level error), and the next call tries
//   again.
// Threads: any; waits while another one initialises.
TARNWICK_API CURL* TWCurlInit();

#endif  // TARNWICK_HTTP_TWCURL_H_
