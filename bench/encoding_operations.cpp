// Percent-encoding and base64.
#include <openssl/evp.h>

#include <cstdlib>
#include <cstring>

#include "bench/operations.h"
#include "tarnwick/utils/utils.h"

namespace {

// Text such as a query's value is: one byte in five must be escaped.
std::string QueryText(size_t size) {
  static constexpr char kText[] = "Front door/gate 2&mode=day+night;";
  std::string text;
  while (text.size() < size) text += kText;
  text.resize(size);
  return text;
}

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

// One pass with a table into a new string.
template <size_t kSize>
class UrlEncodingFloor : public Operation {
 public:
  UrlEncodingFloor() {
    for (int c = 0; c < 256; ++c)
      m_plain[c] = std::isalnum(c) != 0 || std::strchr("_~-.", c) != nullptr;
    m_plain[0] = false;
  }

  void Run(int count) override {
    for (int i = 0; i < count; ++i) Use(Encode(std::string(m_text)).data());
  }

 private:
  std::string Encode(const std::string& text) const {
    std::string result(text.size() * 3, '\0');
    char* out = &result[0];
    for (const char c : text) {
      const auto byte = static_cast<unsigned char>(c);
      if (m_plain[byte]) {
        *out++ = c;
      } else {
        *out++ = '%';
        *out++ = "0123456789ABCDEF"[byte >> 4];
        *out++ = "0123456789ABCDEF"[byte & 15];
      }
    }
    result.resize(static_cast<size_t>(out - result.data()));
    return result;
  }

  const std::string m_text = QueryText(kSize);
  bool m_plain[256];
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
      const size_t length = std::strlen(m_text.c_str());
      auto* const encoded = static_cast<unsigned char*>(std::malloc((length + 2) / 3 * 4 + 1));
      EVP_EncodeBlock(encoded, reinterpret_cast<const unsigned char*>(m_text.data()),
                      static_cast<int>(length));
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
