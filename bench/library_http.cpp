// The library as an HTTP client.
#include "bench/http_works.h"
#include "bench/server.h"
#include "tarnwick/http/twhttp.h"

namespace {

std::unique_ptr<TWHttpClient> ClientFor(const Exchange& exchange) {
  const bool digest = exchange.kind == Exchange::kDigestGet;
  return std::make_unique<TWHttpClient>(kHost, ServerPort(exchange.tls), exchange.path,
                                        digest ? kUser : "", digest ? kPassword : "", kTimeout,
                                        exchange.tls, true, false, false, HTTP_VERSION_1_1, "");
}

void ExpectSuccess(TWHttpClient* client, int result) {
  int status = 0;
  Expect(result == HTTP_RET_OK && client->CheckResponse(status) == HTTP_RET_OK, kLibrary,
         "has no success");
}

std::string Fetch(const Exchange& exchange) {
  const auto client = ClientFor(exchange);
  std::string body;
  switch (exchange.kind) {
    case Exchange::kForm:  // what SendHttpPost does, and a look at the status
      ExpectSuccess(client.get(), client->SendRequestBySocketPost(exchange.body));
      return body;
    case Exchange::kSoap:
      ExpectSuccess(client.get(), client->SendReqBySocketPost(exchange.body, body));
      return body;
    default:
      ExpectSuccess(client.get(), client->SendRequest(HTTP_METHOD_GET, "?"));
      Expect(client->ReadBody(body) == HTTP_RET_OK, kLibrary, "cannot read the body");
      return body;
  }
}

Json::Value FetchJson(const Exchange& exchange) {
  Json::Value value;
  const int result = SendHttpGet(kHost, ServerPort(false), exchange.path, value, kTimeout, false);
  Expect(result == 0, kLibrary, "cannot get the JSON");
  return value;
}

xmlDoc* FetchXml(const Exchange& exchange) {
  xmlDoc* document = nullptr;
  const int result = ClientFor(exchange)->SendReqByXMLSocketPost(exchange.body, document);
  Expect(result == HTTP_RET_OK, kLibrary, "cannot get the document");
  return document;
}

void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  const auto client = ClientFor(exchange);
  ExpectSuccess(client.get(), client->SendRequest(HTTP_METHOD_GET, "?"));
  static char piece[kPieceSize];
  for (int n; (n = client->ReadData(piece, kPieceSize)) > 0;) take(piece, static_cast<size_t>(n));
}

std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  const auto client = ClientFor(exchange);
  Expect(client->OpenRawDataUpload() == HTTP_RET_OK, kLibrary, "cannot open the upload");
  for (size_t done = 0; done < kUploadSize; done += piece.size()) {
    const int count = client->WriteData(piece.data(), static_cast<int>(piece.size()));
    Expect(count == static_cast<int>(piece.size()), kLibrary, "cannot upload");
  }
  return client->GetResp();
}

std::shared_ptr<void> FetchAndStay(const Exchange& exchange) {
  std::shared_ptr<TWHttpClient> client = ClientFor(exchange);
  std::string body;
  ExpectSuccess(client.get(), client->SendRequest(HTTP_METHOD_GET, "?"));
  Expect(client->ReadBody(body) == HTTP_RET_OK, kLibrary, "cannot read the body");
  return client;
}

void AddLibraryHttp(Registry* registry) {
  HttpClient client;
  client.name = kLibrary;
  client.fetch = Fetch;
  client.digest = true;
  client.tls = true;
  client.fetchJson = FetchJson;
  client.fetchXml = FetchXml;
  client.fetchPieces = FetchPieces;
  client.upload = UploadPieces;
  client.fetchAndStay = FetchAndStay;
  AddHttpClient(registry, client);
}

const Family kLibraryHttp(AddLibraryHttp);

}  // namespace
