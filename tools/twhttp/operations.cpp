#include "tools/twhttp/operations.h"

namespace {

constexpr unsigned kSocket = kBuffered | kSource | kTimeout;

constexpr OperationTable kOperations = {{
    {OperationId::kGet, "get", "SendRequest",
     "GET over the client's socket, with credentials if asked", "GET", Scheme::kEither, false,
     kSocket | kCredentials | kVersion | kCookie | kBasicFirst | kEncoding | kStream},
    {OperationId::kForm, "form", "SendRequestBySocketPost", "POST a form over the client's socket",
     "POST", Scheme::kEither, false, kSocket | kVersion | kCookie | kBody | kStream},
    {OperationId::kSoap, "soap", "SendReqBySocketPost", "POST a SOAP envelope", "POST",
     Scheme::kEither, false, kSocket | kBody},
    {OperationId::kSoapAuth, "soap-auth", "SendAuthReqBySocketPost",
     "POST a SOAP envelope, with credentials if asked", "POST", Scheme::kEither, false,
     kSocket | kCredentials | kBody},
    {OperationId::kSoapXml, "soap-xml", "SendReqByXMLSocketPost",
     "POST a SOAP envelope and parse the response", "POST", Scheme::kEither, false,
     kSocket | kBody},
    {OperationId::kUpload, "upload", "OpenRawDataUpload, WriteData, GetResp",
     "stream a file as a multipart POST", "POST", Scheme::kEither, false,
     kSocket | kCookie | kBody},
    {OperationId::kCurlGet, "curl-get", "SendRequestByCurl (GET)", "GET through libcurl", "GET",
     Scheme::kEither, true, kCredentials | kCookie | kVerify | kResponseFile | kTimeout},
    {OperationId::kCurlPost, "curl-post", "SendRequestByCurl (POST)",
     "POST the path as a form to the host's root through libcurl", "POST", Scheme::kEither, true,
     kCredentials | kCookie | kVerify | kResponseFile | kTimeout},
    {OperationId::kCurlForm, "curl-form", "SendRequestByPost",
     "POST what follows the separator in the path through libcurl", "POST", Scheme::kPlain, true,
     kCredentials | kVersion | kSeparators},
    {OperationId::kXmlGet, "xml-get", "SendReqByXMLGet", "GET an XML document", "GET",
     Scheme::kPlain, true, kCredentials | kTimeout},
    {OperationId::kXmlPost, "xml-post", "SendReqByXMLPost", "POST an XML document", "POST",
     Scheme::kPlain, true, kCredentials | kBody},
    {OperationId::kXmlPut, "xml-put", "SendReqByXMLPut", "PUT an XML document", "PUT",
     Scheme::kPlain, true, kCredentials | kBody},
    {OperationId::kXmlDelete, "xml-delete", "SendReqByXMLDelete", "DELETE through libcurl",
     "DELETE", Scheme::kPlain, true, kCredentials},
    {OperationId::kJsonGet, "json-get", "SendHttpGet", "ask a JSON service in one call", "GET",
     Scheme::kPlain, false, kEncoding | kTimeout},
    {OperationId::kJsonPost, "json-post", "SendHttpPost",
     "post a form to a JSON service in one call", "POST", Scheme::kPlain, false,
     kCookie | kBody | kTimeout},
    {OperationId::kJsonGets, "json-gets", "SendHttpsGet", "ask a JSON service over TLS in one call",
     "GET", Scheme::kTls, true, kTimeout},
    {OperationId::kRawResp, "raw-resp", "GetResp",
     "send bytes as they are and read a whole response", "GET", Scheme::kEither, false,
     kSocket | kBody},
}};

}  // namespace

const OperationTable& Operations() {
  return kOperations;
}
