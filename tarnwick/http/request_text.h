// The requests that go over the client's socket, as text. Pure functions.
#ifndef TARNWICK_HTTP_REQUEST_TEXT_H_
#define TARNWICK_HTTP_REQUEST_TEXT_H_

#include <string>

#include "tarnwick/http/request_parts.h"

namespace tarnwick {

std::string GetRequest(const RequestParts& parts);

std::string FormPostRequest(const RequestParts& parts, const std::string& content);

std::string SoapPostRequest(const RequestParts& parts, const std::string& body);

// Without the body, whose pieces the caller sends.
std::string UploadRequest(const RequestParts& parts);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_REQUEST_TEXT_H_
