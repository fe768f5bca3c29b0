// The responses that pile up in a client until they are parsed as one document.
#ifndef TARNWICK_FUZZ_ORACLE_XML_RESPONSE_H_
#define TARNWICK_FUZZ_ORACLE_XML_RESPONSE_H_

#include <cstddef>
#include <optional>
#include <string>

namespace oracle {

class Responses {
 public:
  void Add(const std::string& bytes);

  // Memory ran out: what came before shows zero bytes.
  void Lose();

  // The text to parse, if there is any; none is left.
  std::optional<std::string> Take();

  size_t Size() const { return text_.size(); }
  bool There() const { return there_; }

 private:
  bool there_ = false;
  std::string text_;
};

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_XML_RESPONSE_H_
