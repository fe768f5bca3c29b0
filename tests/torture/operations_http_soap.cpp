// SOAP POSTs over the client's socket.
#include "tests/torture/http_operations.h"
#include "tests/torture/operations.h"
#include "tests/torture/peer_process.h"

namespace {

// Whole, or, as documented, what came until a read was cut short.
void ExpectReply(Stage& stage, int result, const std::string& reply) {
  ExpectResult(stage, result);
  if (result != HTTP_RET_OK) return;
  const std::string whole = kXmlBody;
  const bool part = stage.MayFail() && whole.compare(0, reply.size(), reply) == 0;
  stage.Expect(reply == whole || part, "the reply is not the peer's");
}

void Soap(Stage& stage) {
  Client client = NewClient(stage, At("soap/xml"));
  const std::string body = "<soap/>";
  std::string reply = "old";
  int result = -1;
  stage.Run([&] { result = client->SendReqBySocketPost(body, reply); });
  ExpectReply(stage, result, reply);
  stage.Expect(result == HTTP_RET_OK || reply == "old", "a failure has changed the reply");
  Destroy(stage, std::move(client));
}

void SoapLogin(Stage& stage, const char* path) {
  Client client = NewClient(stage, At(path));
  const std::string body = "<soap/>";
  std::string reply;
  int result = -1;
  stage.Run([&] { result = client->SendAuthReqBySocketPost(body, reply); });
  stage.ExpectEither(result == HTTP_RET_OK, result != HTTP_RET_OK, "the result is wrong");
  if (result == HTTP_RET_OK) ExpectReply(stage, result, reply);
  Destroy(stage, std::move(client));
}

void SoapDigest(Stage& stage) {
  SoapLogin(stage, "digest/xml");
}

void SoapBasic(Stage& stage) {
  SoapLogin(stage, "basic/xml");
}

void SoapXml(Stage& stage) {
  Client client = NewClient(stage, At("soap/xml"));
  Document reply;
  int result = -1;
  stage.Run([&] { result = client->SendReqByXMLSocketPost("<soap/>", reply.Get()); });
  ExpectResult(stage, result);
  // A reply that was cut short is not well-formed.
  if (result == HTTP_RET_OK) {
    stage.ExpectEither(reply.IsBody(), reply.Get() == nullptr, "the document is not the peer's");
  } else {
    stage.Expect(reply.Get() == nullptr, "a failure has left a document");
  }
  Destroy(stage, std::move(client));
}

}  // namespace

std::vector<Operation> HttpSoapOperations() {
  return {
      {"soap", Peer::kPlain, Soap},
      {"soap_digest", Peer::kPlain, SoapDigest},
      {"soap_basic", Peer::kPlain, SoapBasic},
      {"soap_xml", Peer::kPlain, SoapXml, true},
  };
}
