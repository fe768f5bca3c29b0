// tarnwick_text(3): a query, a login and a file name.
#include <cstdlib>
#include <memory>

#include "docs/man/examples/examples.h"
#include "tarnwick/utils/utils.h"

std::string QueryOf(const std::string& place) {
  // "Main Gate/2" becomes "place=Main%20Gate/2".
  return "place=" + UrlEncode(TrimString(place, " \t"), "/");
}

std::string BasicLogin(const std::string& user, const std::string& password) {
  const std::unique_ptr<char, decltype(&std::free)> encoded(
      Base64Encode((user + ":" + password).c_str()), &std::free);
  return encoded != nullptr ? encoded.get() : "";
}

std::string SnapshotName(int camera, int64_t microseconds) {
  return IntToString(camera) + "-" + FormatUtcTimeStamp(microseconds) + ".jpg";
}
