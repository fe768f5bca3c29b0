#include "tools/twhttp/rules.h"

#include "tools/common/text.h"
#include "tools/twhttp/message.h"

namespace {

// The operations that build their requests in the same way.
enum Family : unsigned {
  kGetFamily = 1,
  kFormFamily = 2,
  kSoapFamily = 4,
  kUploadFamily = 8,
  kCurlFamily = 16,
  kCurlFormFamily = 32,
  kXmlFamily = 64,
  kRawFamily = 128,
};

constexpr unsigned kByCurl = kCurlFamily | kCurlFormFamily | kXmlFamily;

Family FamilyOf(OperationId id) {
  switch (id) {
    case OperationId::kGet:
    case OperationId::kJsonGet:
      return kGetFamily;
    case OperationId::kForm:
    case OperationId::kJsonPost:
      return kFormFamily;
    case OperationId::kSoap:
    case OperationId::kSoapAuth:
    case OperationId::kSoapXml:
      return kSoapFamily;
    case OperationId::kUpload:
      return kUploadFamily;
    case OperationId::kCurlGet:
    case OperationId::kCurlPost:
    case OperationId::kJsonGets:
      return kCurlFamily;
    case OperationId::kCurlForm:
      return kCurlFormFamily;
    case OperationId::kRawResp:
      return kRawFamily;
    default:
      return kXmlFamily;
  }
}

constexpr struct {
  unsigned families;
  const char* header;  // "" for the request line
  const char* rule;
} kRules[] = {
    {kGetFamily, "", "HTTP/1.0 unless --http 1.1; cut after 2,047 bytes"},
    {kFormFamily, "", "HTTP/1.1 unless --http 1.0"},
    {kSoapFamily, "", "always HTTP/1.1"},
    {kUploadFamily, "", "always HTTP/1.1"},
    {kCurlFormFamily, "", "the path up to the separator; the version is --http's or libcurl's"},
    {kCurlFamily | kXmlFamily, "", "libcurl's version"},
    {kRawFamily, "", "as given"},
    {kGetFamily, "Host", "with --http 1.1, without the port"},
    {kFormFamily | kSoapFamily, "Host", "always, without the port"},
    {kUploadFamily, "Host", "always, with the port"},
    {kByCurl, "Host", "libcurl's, with the port unless it is the scheme's"},
    {kGetFamily | kCurlFamily, "User-Agent", "always this name"},
    {kGetFamily | kFormFamily | kUploadFamily | kCurlFamily, "Cookie",
     "--cookie, or the last Set-Cookie up to its semicolon"},
    {kGetFamily, "Authorization", "after a 401, or at once with --basic-first"},
    {kSoapFamily, "Authorization", "after a 401, by soap-auth alone"},
    {kCurlFamily, "Authorization", "the credentials at once, by Basic, empty or not"},
    {kCurlFormFamily, "Authorization", "libcurl's, Basic or Digest as a 401 asks"},
    {kXmlFamily, "Authorization", "Basic at once; xml-get Basic or Digest as a 401 asks"},
    {kFormFamily, "Content-Type", "a form in UTF-8"},
    {kSoapFamily, "Content-Type", "SOAP 1.2 in UTF-8"},
    {kUploadFamily, "Content-Type", "a multipart body with the fixed boundary"},
    {kCurlFamily, "Content-Type", "a form in UTF-8, also with a GET"},
    {kCurlFormFamily, "Content-Type", "libcurl's for a form"},
    {kXmlFamily, "Content-Type", "XML in UTF-8"},
    {kFormFamily | kSoapFamily, "Content-Length", "the body's length"},
    {kUploadFamily, "Content-Length", "128 GiB, so that the peer waits for whatever comes"},
    {kCurlFamily, "Content-Length", "the path's length, which is the body"},
    {kCurlFormFamily | kXmlFamily, "Content-Length", "the body's length, by libcurl"},
    {kFormFamily, "Connection", "with HTTP/1.1; the semicolon is on purpose"},
    {kUploadFamily, "Connection", "the stream stays open"},
    {kCurlFamily, "Connection", "one request a connection"},
    {kUploadFamily, "Cache-Control", "fixed; the blank before the colon is on purpose"},
    {kCurlFamily | kCurlFormFamily | kXmlFamily, "Accept", "anything"},
    {kRawFamily, "*", "as given"},
};

bool Matches(const char* header, const std::string& name) {
  return std::string(header) == "*" ? !name.empty() : EqualsIgnoringCase(header, name);
}

}  // namespace

std::string RuleOf(const Operation& operation, const std::string& name) {
  const unsigned family = FamilyOf(operation.id);
  for (const auto& rule : kRules) {
    if ((rule.families & family) != 0 && Matches(rule.header, name)) return rule.rule;
  }
  return "";
}
