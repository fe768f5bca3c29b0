#include "bench/exchange.h"

#include <openssl/evp.h>

#include "bench/texts.h"

namespace {

Exchange Get(const std::string& path, const std::string& response) {
  return {Exchange::kGet, false, false, path, "", "", response};
}

}  // namespace

Exchange JsonGet() {
  return Get("/json", kJsonText);
}

Exchange DigestGet() {
  Exchange exchange = Get("/digest", kJsonText);
  exchange.kind = Exchange::kDigestGet;
  return exchange;
}

Exchange FormPost() {
  return {Exchange::kForm,
          false,
          false,
          "/form",
          "application/x-www-form-urlencoded; charset=utf-8",
          "name=front+door&fps=25&on=1",
          ""};
}

Exchange SoapPost() {
  return {Exchange::kSoap, false,         false, "/soap", "application/soap+xml; charset=utf-8",
          Envelope(4096),  Envelope(4096)};
}

Exchange SoapXml() {
  return {
      Exchange::kSoap,
      false,
      false,
      "/soap_xml",
      "application/soap+xml; charset=utf-8",
      Envelope(512),
      "<e:Envelope xmlns:e=\"urn:e\">\r\n  <e:Body>\r\n<a>1\r\n2</a></e:Body>\r\n</e:Envelope>"};
}

Exchange TlsGet() {
  Exchange exchange = JsonGet();
  exchange.tls = true;
  return exchange;
}

Exchange BodyGet(size_t size, bool chunked) {
  Exchange exchange =
      Get((chunked ? "/chunked/" : "/body/") + std::to_string(size), BodyText(size));
  exchange.chunked = chunked;
  return exchange;
}

Exchange TlsBodyGet(size_t size) {
  Exchange exchange = BodyGet(size, false);
  exchange.tls = true;
  return exchange;
}

Exchange Upload() {
  return {Exchange::kUpload,          false, false, "/upload", "application/octet-stream", "",
          std::to_string(kUploadSize)};
}

std::string BodyText(size_t size) {
  std::string block;
  for (size_t i = 0; i < 4093; ++i) block += static_cast<char>('A' + i * 7 % 26);
  std::string text;
  text.reserve(size + block.size());
  while (text.size() < size) text += block;
  text.resize(size);
  return text;
}

std::string Md5Hex(const std::string& text) {
  unsigned char digest[EVP_MAX_MD_SIZE];
  unsigned int size = 0;
  EVP_Digest(text.data(), text.size(), digest, &size, EVP_md5(), nullptr);
  std::string hex;
  for (unsigned int i = 0; i < size; ++i) {
    hex += "0123456789abcdef"[digest[i] >> 4];
    hex += "0123456789abcdef"[digest[i] & 15];
  }
  return hex;
}

std::string DigestLine(const std::string& path) {
  const std::string user = kUser, realm = kRealm, nonce = kNonce;
  const std::string secret = Md5Hex(user + ":" + realm + ":" + kPassword);
  const std::string request = Md5Hex("GET:" + path);
  const std::string response = Md5Hex(secret + ":" + nonce + ":00000001:0a4f113b:auth:" + request);
  return "Authorization: Digest username=\"" + user + "\", realm=\"" + realm + "\", nonce=\"" +
         nonce + "\", uri=\"" + path + "\", response=\"" + response +
         "\", qop=auth, nc=00000001, cnonce=\"0a4f113b\"";
}
