// The requests through libcurl.
#include <json/json.h>
#include <libxml/parser.h>

#include <cstdio>

#include "tests/soak/operations.h"

namespace {

struct FileCloser {
  void operator()(FILE* file) const { fclose(file); }
};

// Half of the TLS requests trust the server's authority, the others anybody; the one that must meet
// the wrong certificate verifies it.
bool Verifies(const Plan& plan) {
  return plan.fault == Fault::kBadCertificate || plan.id % 2 == 0;
}

Outcome Refused(const Plan& plan, int result) {
  const bool certificate = plan.fault == Fault::kBadCertificate;
  return FailedWith(result, {certificate ? HTTP_RET_CERT_ERROR : HTTP_RET_IO_ERROR});
}

Outcome CurlGet(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  const int result = client->SendRequestByCurl(HTTP_METHOD_GET, Verifies(plan), TimeoutOf(plan));
  if (result != HTTP_RET_OK) return Refused(plan, result);
  return Compare(client->GetCurlText(), AnswerOf(plan));
}

Outcome CurlPost(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  client->SetCookie("id=" + std::to_string(plan.id));
  const int result = client->SendRequestByCurl(HTTP_METHOD_POST, Verifies(plan), TimeoutOf(plan));
  if (result != HTTP_RET_OK) return Refused(plan, result);
  return Compare(client->GetCurlText(), AnswerOf(plan));
}

std::string ContentOf(FILE* file) {
  std::string content(static_cast<size_t>(ftell(file)), '\0');
  rewind(file);
  content.resize(fread(content.data(), 1, content.size(), file));
  return content;
}

// The file holds the headers, an empty line and the body.
Outcome Download(const Plan& plan, const Session& session) {
  const std::unique_ptr<FILE, FileCloser> file(tmpfile());
  if (!file) return Wrong("no temporary file");
  const auto client = NewClient(plan, session, ToPath(plan));
  client->SetCurlRespFile(file.get());
  const int result = client->SendRequestByCurl(HTTP_METHOD_GET, Verifies(plan), TimeoutOf(plan));
  client->SetCurlRespFile(nullptr);
  if (result != HTTP_RET_OK) return Refused(plan, result);
  const std::string content = ContentOf(file.get());
  const std::string id = std::to_string(plan.id);
  const size_t head = content.find("\r\n\r\n");
  // A head that broke off ends without its empty line.
  if (head == std::string::npos && plan.fault == Fault::kCutHead) return {Outcome::kCut, ""};
  if (head == std::string::npos ||
      content.rfind("Content-Type: text/x-soak; id=" + id + "\r\nSet-Cookie: id=" + id, 0) != 0) {
    return Wrong("the file's headers");
  }
  return Compare(content.substr(head + 4), AnswerOf(plan));
}

Outcome LoginPost(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan) + "?" + RequestBodyOf(plan));
  const int result = client->SendRequest(HTTP_METHOD_POST, "?");
  return result == HTTP_RET_OK ? Outcome() : FailedWith(result, {HTTP_RET_IO_ERROR});
}

Outcome ReadXml(const Plan& plan, int result, TWHttpClient* client) {
  xmlDoc* doc = nullptr;
  const bool parsed = client->GetResponseXML(doc);
  if (parsed != (doc != nullptr)) return Wrong("a document where there is none");
  if (result != HTTP_RET_OK) {
    xmlFreeDoc(doc);
    return FailedWith(result, {HTTP_RET_IO_ERROR});
  }
  if (!parsed) return {Outcome::kFailed, "without a document"};
  return CompareXml(plan, doc);
}

xmlDoc* NewPreset(const Plan& plan) {
  const std::string text = "<preset><pan>" + std::to_string(plan.id) + "</pan></preset>";
  return xmlParseMemory(text.data(), static_cast<int>(text.size()));
}

Outcome XmlRequest(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  xmlDoc* preset = NewPreset(plan);
  int result;
  switch (plan.operation) {
    case Operation::kXmlPost:
      result = client->SendReqByXMLPost(preset);
      break;
    case Operation::kXmlPut:
      result = client->SendReqByXMLPut(preset);
      break;
    case Operation::kXmlDelete:
      result = client->SendReqByXMLDelete();
      break;
    default:
      result = client->SendReqByXMLGet(TimeoutOf(plan));
  }
  xmlFreeDoc(preset);
  return ReadXml(plan, result, client.get());
}

Outcome JsonGetTls(const Plan& plan, const Session& session) {
  Json::Value reply;
  const int result = SendHttpsGet("127.0.0.1", PortOf(plan, session.endpoints), ToPath(plan), reply,
                                  TimeoutOf(plan));
  if (plan.fault == Fault::kBadCertificate) return FailedWith(result, {-2});
  if (result != 0) return FailedWith(result, {-1, -3});
  // An empty answer is a success that leaves the value as it was.
  if (reply.isNull()) return {Outcome::kCut, ""};
  return Compare(reply["value"].asString(), ValueOf(plan));
}

}  // namespace

Outcome RunCurlOperation(const Plan& plan, const Session& session) {
  switch (plan.operation) {
    case Operation::kCurlGet:
      return CurlGet(plan, session);
    case Operation::kCurlPost:
      return CurlPost(plan, session);
    case Operation::kDownload:
      return Download(plan, session);
    case Operation::kLoginPost:
      return LoginPost(plan, session);
    case Operation::kJsonGetTls:
      return JsonGetTls(plan, session);
    default:
      return XmlRequest(plan, session);
  }
}
