#include "fuzz/oracle/curl_buffer.h"

namespace oracle {

void Buffer::Append(const std::string& more, bool memory) {
  if (!memory) {
    there = false;
    bytes.clear();
    return;
  }
  if (!there) bytes.assign(size, '\0');
  there = true;
  bytes += more;
  size = static_cast<uint32_t>(bytes.size());
}

}  // namespace oracle
