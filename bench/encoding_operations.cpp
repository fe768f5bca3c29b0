// Percent-encoding and base64.
#include <cstdlib>

#include "bench/operations.h"
#include "bench/plain.h"
#include "bench/texts.h"
#include "tarnwick/utils/utils.h"

namespace {

template <size_t kSize>
class UrlEncoding : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) Use(UrlEncode(m_text, m_keep).data());
  }

 private:
  const std::string m_text = QueryText(kSize);
  const std::string m_keep;
};

template <size_t kSize>
class UrlEncodingFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) Use(UrlEncoded(m_text).data());
  }

 private:
  const std::string m_text = QueryText(kSize);
};

template <size_t kSize>
class Base64 : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      char* const encoded = Base64Encode(m_text.c_str());
      Use(encoded);
      std::free(encoded);
    }
  }

 private:
  const std::string m_text = QueryText(kSize);
};

template <size_t kSize>
class Base64Floor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      char* const encoded = Base64ByOpenssl(m_text.c_str());
      Use(encoded);
      std::free(encoded);
    }
  }

 private:
  const std::string m_text = QueryText(kSize);
};

}  // namespace

void AddEncodingOperations(std::vector<Entry>* entries) {
  entries->push_back({"url_encode_64", "url_encode_64_floor", 1000, 64, Make<UrlEncoding<64>>});
  entries->push_back({"url_encode_64_floor", "", 1000, 64, Make<UrlEncodingFloor<64>>});
  entries->push_back({"url_encode_4k", "url_encode_4k_floor", 100, 4096, Make<UrlEncoding<4096>>});
  entries->push_back({"url_encode_4k_floor", "", 100, 4096, Make<UrlEncodingFloor<4096>>});
  entries->push_back({"base64_32", "base64_32_floor", 1000, 32, Make<Base64<32>>});
  entries->push_back({"base64_32_floor", "", 1000, 32, Make<Base64Floor<32>>});
  entries->push_back({"base64_4k", "base64_4k_floor", 100, 4096, Make<Base64<4096>>});
  entries->push_back({"base64_4k_floor", "", 100, 4096, Make<Base64Floor<4096>>});
}
