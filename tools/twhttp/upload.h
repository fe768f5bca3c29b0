// The body of a streaming upload: one part, and the boundary after it.
#ifndef TARNWICK_TOOLS_TWHTTP_UPLOAD_H_
#define TARNWICK_TOOLS_TWHTTP_UPLOAD_H_

#include <string>

#include "tarnwick/http/twhttp.h"
#include "tools/twhttp/options.h"

// Sends the file of `options`, or `text` when there is none, as it is read.
// REQUIRES: OpenRawDataUpload was successful.
// Results: false when the file or the connection failed.
bool UploadFile(TWHttpClient* client, const Options& options, const std::string& text);

#endif  // TARNWICK_TOOLS_TWHTTP_UPLOAD_H_
