// The header fields of a response that the client keeps: the one list of them.
#ifndef TARNWICK_HTTP_KEPT_FIELDS_H_
#define TARNWICK_HTTP_KEPT_FIELDS_H_

#include <string_view>

#include "tarnwick/http/twhttp.h"

namespace tarnwick {

enum class KeptAs {
  kContent,  // read by GetHttpContent
  kCookie,
  kChallenge,
  kTransferEncoding,
};

struct KeptField {
  std::string_view name;  // in any case
  KeptAs as;
  HTTP_MAP_KEY key = {};  // of kContent
};

// A field whose name begins with one of these is taken for it, and one of these without a value
// fails the response; pinned by CheckContentType.ALongerNameWithAKnownPrefixIsTakenForTheKnownOne and
// CheckContentType.EachKnownNameWithoutAValueIsNotReady.
inline constexpr KeptField kKeptFields[] = {
    {"Content-Type", KeptAs::kContent, HTTP_CONTENT_TYPE},
    {"Content-Length", KeptAs::kContent, HTTP_CONTENT_LENGTH},
    {"Content-Range", KeptAs::kContent, HTTP_CONTENT_RANGE},
    {"Set-Cookie", KeptAs::kCookie},
    {"WWW-Authenticate", KeptAs::kChallenge},
    {"Transfer-Encoding", KeptAs::kTransferEncoding},
};

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_KEPT_FIELDS_H_
