#include "tarnwick/http/query_encoding.h"

#include <algorithm>
#include <cstring>

#include "tarnwick/utils/utils.h"

std::string EncodeQueryValues(const std::string& path, const std::string& keep) {
  const std::string text(path.c_str());  // a zero byte ends the request line
  const size_t question = text.find('?');
  if (question == std::string::npos) return path;
  std::string result = text.substr(0, question + 1);
  size_t segment = question + 1;
  while (segment < text.size()) {
    // A part's first character is never its "=": a value without a name stays as it is.
    const size_t equals = text.find('=', segment + 1);
    if (equals == std::string::npos) break;
    result.append(text, segment, equals + 1 - segment);
    const size_t end = std::min(text.find('&', equals + 1), text.size());
    result += UrlEncode(text.substr(equals + 1, end - equals - 1), keep);
    segment = end;
  }
  if (segment < text.size()) result.append(text, segment, std::string::npos);
  return result;
}
