#include "tarnwick/http/query_encoding.h"

#include <algorithm>
#include <cstring>

#include "tarnwick/utils/utils.h"

namespace tarnwick {

std::string EncodeQueryValues(const std::string& path, const std::string& keep) {
  const size_t question = path.find('?');
  if (question == std::string::npos) return path;
  // A zero byte is looked at where no value is left to encode, and nowhere else.
  const size_t length = strlen(path.c_str());
  std::string result = path.substr(0, question + 1);
  for (size_t segment = question + 1;;) {
    // A part's first character is never its "=": a value without a name stays as it is.
    const size_t equals = path.find('=', segment + 1);
    if (equals == std::string::npos) {
      if (segment < length) result.append(path, segment, length - segment);
      return result;
    }
    const size_t value = equals + 1;
    const size_t end = std::min(path.find('&', value), path.size());
    result.append(path, segment, value - segment);
    result += UrlEncode(path.substr(value, end - value), keep);
    if (end == path.size() || value >= length) return result;
    segment = end;
  }
}

}  // namespace tarnwick
