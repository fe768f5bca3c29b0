#include "fuzz/oracle/xml_response.h"

#include <utility>

namespace oracle {

void Responses::Add(const std::string& bytes) {
  there_ = true;
  text_ += bytes;
}

void Responses::Lose() {
  there_ = false;
  text_.assign(text_.size(), '\0');
}

std::optional<std::string> Responses::Take() {
  // Without memory the size stays as it is.
  if (!std::exchange(there_, false)) return std::nullopt;
  return std::exchange(text_, std::string());
}

}  // namespace oracle
