// The library's operations, by the names of the sub-commands.
#ifndef TARNWICK_TOOLS_TWHTTP_OPERATIONS_H_
#define TARNWICK_TOOLS_TWHTTP_OPERATIONS_H_

#include <array>

// What an operation of the library offers or needs.
enum Feature : unsigned {
  kCredentials = 1,
  kVersion = 2,
  kCookie = 4,
  kBasicFirst = 8,
  kEncoding = 16,
  kBuffered = 32,
  kSource = 64,
  kBody = 128,
  kVerify = 256,
  kResponseFile = 512,
  kSeparators = 1024,
  kTimeout = 2048,
  kStream = 4096,  // the body may be endless and is written while it comes
};

enum class Scheme { kEither, kPlain, kTls };

enum class OperationId {
  kGet,
  kForm,
  kSoap,
  kSoapAuth,
  kSoapXml,
  kUpload,
  kCurlGet,
  kCurlPost,
  kCurlForm,
  kXmlGet,
  kXmlPost,
  kXmlPut,
  kXmlDelete,
  kJsonGet,
  kJsonPost,
  kJsonGets,
  kRawResp,
};

struct Operation {
  OperationId id;
  const char* name;
  const char* call;  // the library's functions
  const char* summary;
  const char* method;
  Scheme scheme;
  bool by_curl;
  unsigned features;

  bool Uses(unsigned feature) const { return (features & feature) != 0; }
};

using OperationTable = std::array<Operation, 17>;

const OperationTable& Operations();

#endif  // TARNWICK_TOOLS_TWHTTP_OPERATIONS_H_
