// Poco's Net: a session and a connection a request; its head parser and its encoder.
#include <Poco/Net/Context.h>
#include <Poco/Net/HTTPClientSession.h>
#include <Poco/Net/HTTPCredentials.h>
#include <Poco/Net/HTTPRequest.h>
#include <Poco/Net/HTTPResponse.h>
#include <Poco/Net/HTTPSClientSession.h>
#include <Poco/StreamCopier.h>
#include <Poco/Timespan.h>
#include <Poco/URI.h>

#include <cstdlib>
#include <sstream>

#include "bench/http_works.h"
#include "bench/plain.h"
#include "bench/server.h"
#include "bench/texts.h"

namespace {

using Poco::Net::HTTPClientSession;
using Poco::Net::HTTPCredentials;
using Poco::Net::HTTPRequest;
using Poco::Net::HTTPResponse;

constexpr char kPoco[] = "Poco";

// As the others' clients, each with a context of its own.
std::shared_ptr<HTTPClientSession> SessionFor(const Exchange& exchange) {
  std::shared_ptr<HTTPClientSession> session;
  const auto port = static_cast<Poco::UInt16>(ServerPort(exchange.tls));
  if (exchange.tls) {
    const Poco::Net::Context::Ptr context = new Poco::Net::Context(
        Poco::Net::Context::TLS_CLIENT_USE, "", Poco::Net::Context::VERIFY_NONE);
    session = std::make_shared<Poco::Net::HTTPSClientSession>(kHost, port, context);
  } else {
    session = std::make_shared<HTTPClientSession>(kHost, port);
  }
  session->setTimeout(Poco::Timespan(kTimeout, 0));
  return session;
}

HTTPRequest RequestFor(const Exchange& exchange) {
  const bool post = !exchange.contentType.empty();
  HTTPRequest request(post ? HTTPRequest::HTTP_POST : HTTPRequest::HTTP_GET, exchange.path,
                      HTTPRequest::HTTP_1_1);
  request.set("User-Agent", "Quenrith Tarnwick");
  if (post) request.setContentType(exchange.contentType);
  if (post) request.setContentLength64(static_cast<Poco::Int64>(exchange.body.size()));
  return request;
}

// Sends the request, with credentials after a challenge, and returns the stream of the body.
std::istream& Send(HTTPClientSession* session, const Exchange& exchange) {
  HTTPRequest request = RequestFor(exchange);
  HTTPResponse response;
  session->sendRequest(request) << exchange.body;
  std::istream* body = &session->receiveResponse(response);
  if (response.getStatus() == HTTPResponse::HTTP_UNAUTHORIZED) {
    HTTPCredentials credentials(kUser, kPassword);
    credentials.authenticate(request, response);
    session->sendRequest(request);
    body = &session->receiveResponse(response);
  }
  Expect(response.getStatus() == HTTPResponse::HTTP_OK, kPoco, "has no success");
  return *body;
}

std::string Fetch(const Exchange& exchange) {
  const auto session = SessionFor(exchange);
  std::string body;
  Poco::StreamCopier::copyToString(Send(session.get(), exchange), body);
  return body;
}

void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  static char piece[kPieceSize];
  const auto session = SessionFor(exchange);
  std::istream& body = Send(session.get(), exchange);
  while (body.read(piece, sizeof(piece)) || body.gcount() > 0) {
    take(piece, static_cast<size_t>(body.gcount()));
  }
}

std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  const auto session = SessionFor(exchange);
  HTTPRequest request = RequestFor(exchange);
  HTTPResponse response;
  std::string body;
  request.setContentLength64(static_cast<Poco::Int64>(kUploadSize));
  std::ostream& out = session->sendRequest(request);
  for (size_t done = 0; done < kUploadSize; done += piece.size()) {
    out.write(piece.data(), static_cast<std::streamsize>(piece.size()));
  }
  Poco::StreamCopier::copyToString(session->receiveResponse(response), body);
  return body;
}

std::shared_ptr<void> FetchAndStay(const Exchange& exchange) {
  const auto session = SessionFor(exchange);
  std::string body;
  Poco::StreamCopier::copyToString(Send(session.get(), exchange), body);
  return session;
}

void ParseHeads(int count) {
  static const std::string head = HeadOf30Lines();
  for (int i = 0; i < count; ++i) {
    std::istringstream stream(head);
    HTTPResponse response;
    response.read(stream);
    Expect(response.getStatus() == HTTPResponse::HTTP_OK && response.size() == 30, kPoco,
           "parses another head");
  }
}

// What UrlEncode keeps, so that both escape the same bytes: these are escaped although they might
// stand in a path.
constexpr char kReserved[] = "!#$%&'+/:;=?@[]";

template <size_t kSize>
void Encode(int count) {
  static const std::string text = QueryText(kSize);
  static const std::string expected = UrlEncoded(text);
  for (int i = 0; i < count; ++i) {
    std::string encoded;
    Poco::URI::encode(text, kReserved, encoded);
    Expect(encoded.size() == expected.size(), kPoco, "encodes something else");
    Use(encoded.data());
  }
}

void AddPoco(Registry* registry) {
  HttpClient client;
  client.name = kPoco;
  client.fetch = Fetch;
  client.digest = true;
  client.tls = true;
  client.fetchPieces = FetchPieces;
  client.upload = UploadPieces;
  client.fetchAndStay = FetchAndStay;
  AddHttpClient(registry, client);
  registry->AddTimed("head_30", kPoco, ParseHeads);
  registry->AddTimed("url_encode_64", kPoco, Encode<64>);
  registry->AddTimed("url_encode_4k", kPoco, Encode<4096>);
}

const Family kPocoFamily(AddPoco);

}  // namespace
