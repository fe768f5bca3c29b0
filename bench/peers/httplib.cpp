// cpp-httplib: a client object and a connection a request.
#include <httplib.h>

#include "bench/http_works.h"
#include "bench/server.h"

namespace {

constexpr char kHttplib[] = "cpp-httplib";

std::shared_ptr<httplib::Client> ClientFor(const Exchange& exchange) {
  const auto client =
      std::make_shared<httplib::Client>(std::string(exchange.tls ? "https" : "http") + "://" +
                                        kHost + ":" + std::to_string(ServerPort(exchange.tls)));
  client->set_connection_timeout(kTimeout);
  client->set_read_timeout(kTimeout);
  client->set_write_timeout(kTimeout);
  client->enable_server_certificate_verification(false);
  if (exchange.kind == Exchange::kDigestGet) client->set_digest_auth(kUser, kPassword);
  return client;
}

void ExpectSuccess(const httplib::Result& result) {
  if (!result) Fail(kHttplib, httplib::to_string(result.error()));
  Expect(result->status == 200, kHttplib, "has no success");
}

std::string Fetch(const Exchange& exchange) {
  const auto client = ClientFor(exchange);
  const httplib::Result result =
      exchange.body.empty() ? client->Get(exchange.path)
                            : client->Post(exchange.path, exchange.body, exchange.contentType);
  ExpectSuccess(result);
  return result->body;
}

void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  ExpectSuccess(ClientFor(exchange)->Get(exchange.path, [&](const char* bytes, size_t size) {
    take(bytes, size);
    return true;
  }));
}

std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  const auto provide = [&](size_t, size_t length, httplib::DataSink& sink) {
    return sink.write(piece.data(), std::min(length, piece.size()));
  };
  const httplib::Result result =
      ClientFor(exchange)->Post(exchange.path, kUploadSize, provide, exchange.contentType);
  ExpectSuccess(result);
  return result->body;
}

std::shared_ptr<void> FetchAndStay(const Exchange& exchange) {
  const auto client = ClientFor(exchange);
  ExpectSuccess(client->Get(exchange.path));
  return client;
}

void AddHttplib(Registry* registry) {
  HttpClient client;
  client.name = kHttplib;
  client.fetch = Fetch;
  client.digest = true;
  client.tls = true;
  client.fetchPieces = FetchPieces;
  client.upload = UploadPieces;
  client.fetchAndStay = FetchAndStay;
  AddHttpClient(registry, client);
}

const Family kHttplibFamily(AddHttplib);

}  // namespace
