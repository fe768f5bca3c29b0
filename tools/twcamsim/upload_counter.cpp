#include "tools/twcamsim/upload_counter.h"

#include <algorithm>

namespace {

std::string ClosingLine(const Request& request) {
  const std::string type = request.Get("Content-Type");
  const std::string mark = "boundary=";
  const size_t at = type.find(mark);
  if (at == std::string::npos) return "";
  std::string boundary = type.substr(at + mark.size());
  boundary.erase(std::min(boundary.find(';'), boundary.size()));
  if (boundary.size() >= 2 && boundary.front() == '"' && boundary.back() == '"') {
    boundary = boundary.substr(1, boundary.size() - 2);
  }
  return "--" + boundary + "--";
}

}  // namespace

UploadCount CountUpload(const Request& request, uint64_t most, const BodySource& source) {
  const std::string closing = ClosingLine(request);
  const int64_t announced = request.Length();
  UploadCount count;
  std::string tail, piece;  // the tail: what a closing line may have begun in
  while (source(&piece)) {
    count.bytes += piece.size();
    tail += piece;
    piece.clear();
    if (!closing.empty() && tail.find(closing) != std::string::npos) {
      count.end = "closed";
      return count;
    }
    if (tail.size() > closing.size()) tail.erase(0, tail.size() - closing.size());
    if ((most > 0 && count.bytes >= most) ||
        (announced >= 0 && count.bytes >= static_cast<uint64_t>(announced))) {
      count.end = "full";
      return count;
    }
  }
  count.end = "cut";
  return count;
}
