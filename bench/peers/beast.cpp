// Boost.Beast with blocking calls: a stream and a connection a request; its parser on memory.
#include <boost/asio/connect.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>

#include <limits>

#include "bench/http_works.h"
#include "bench/server.h"
#include "bench/texts.h"

namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using boost::asio::ip::tcp;
using boost::system::error_code;

constexpr char kBeast[] = "Beast";

tcp::endpoint EndpointFor(const Exchange& exchange) {
  return {asio::ip::make_address(kHost), static_cast<unsigned short>(ServerPort(exchange.tls))};
}

http::request<http::string_body> RequestFor(const Exchange& exchange) {
  const bool post = !exchange.contentType.empty();
  http::request<http::string_body> request(post ? http::verb::post : http::verb::get, exchange.path,
                                           11);
  request.set(http::field::host, kHost);
  request.set(http::field::user_agent, "Quenrith Tarnwick");
  if (post) request.set(http::field::content_type, exchange.contentType);
  request.body() = exchange.body;
  request.keep_alive(false);
  request.prepare_payload();
  return request;
}

template <typename Body>
struct Parser : http::response_parser<Body> {
  Parser() { this->body_limit(std::numeric_limits<std::uint64_t>::max()); }
};

// Writes the request and reads the whole response.
template <typename Stream>
std::string Exchanged(Stream* stream, const Exchange& exchange) {
  http::write(*stream, RequestFor(exchange));
  boost::beast::flat_buffer buffer;
  Parser<http::string_body> parser;
  http::read(*stream, buffer, parser);
  Expect(parser.get().result() == http::status::ok, kBeast, "has no success");
  return std::move(parser.get().body());
}

std::string FetchByTls(const Exchange& exchange) {
  asio::io_context context;
  asio::ssl::context tls(asio::ssl::context::tls_client);
  asio::ssl::stream<tcp::socket> stream(context, tls);
  stream.next_layer().connect(EndpointFor(exchange));
  stream.handshake(asio::ssl::stream_base::client);
  std::string body = Exchanged(&stream, exchange);
  error_code ignored;
  stream.shutdown(ignored);
  return body;
}

std::string Fetch(const Exchange& exchange) {
  if (exchange.tls) return FetchByTls(exchange);
  asio::io_context context;
  tcp::socket stream(context);
  stream.connect(EndpointFor(exchange));
  return Exchanged(&stream, exchange);
}

void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  static char piece[kPieceSize];
  asio::io_context context;
  tcp::socket stream(context);
  stream.connect(EndpointFor(exchange));
  http::write(stream, RequestFor(exchange));
  boost::beast::flat_buffer buffer(kPieceSize);
  Parser<http::buffer_body> parser;
  http::read_header(stream, buffer, parser);
  while (!parser.is_done()) {
    parser.get().body().data = piece;
    parser.get().body().size = sizeof(piece);
    error_code error;
    http::read(stream, buffer, parser, error);
    if (error && error != http::error::need_buffer) Fail(kBeast, error.message());
    take(piece, sizeof(piece) - parser.get().body().size);
  }
}

std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  asio::io_context context;
  tcp::socket stream(context);
  stream.connect(EndpointFor(exchange));
  http::request<http::buffer_body> request(http::verb::post, exchange.path, 11);
  request.set(http::field::host, kHost);
  request.set(http::field::content_type, exchange.contentType);
  request.content_length(kUploadSize);
  request.body().more = true;
  http::request_serializer<http::buffer_body> serializer(request);
  http::write_header(stream, serializer);
  for (size_t done = 0; done < kUploadSize; done += piece.size()) {
    request.body().data = const_cast<char*>(piece.data());
    request.body().size = piece.size();
    request.body().more = done + piece.size() < kUploadSize;
    error_code error;
    http::write(stream, serializer, error);
    if (error && error != http::error::need_buffer) Fail(kBeast, error.message());
  }
  boost::beast::flat_buffer buffer;
  http::response<http::string_body> response;
  http::read(stream, buffer, response);
  return response.body();
}

// What a client of Beast holds on to.
struct Client {
  asio::io_context context;
  tcp::socket stream{context};
  boost::beast::flat_buffer buffer;
};

std::shared_ptr<void> FetchAndStay(const Exchange& exchange) {
  const auto client = std::make_shared<Client>();
  client->stream.connect(EndpointFor(exchange));
  http::write(client->stream, RequestFor(exchange));
  http::response<http::string_body> response;
  http::read(client->stream, client->buffer, response);
  return client;
}

void ParseHeads(int count) {
  static const std::string head = HeadOf30Lines();
  for (int i = 0; i < count; ++i) {
    Parser<http::empty_body> parser;
    error_code error;
    parser.put(asio::buffer(head), error);
    if (error) Fail(kBeast, error.message());
    Expect(parser.is_header_done() && parser.get().result_int() == 200, kBeast,
           "parses another head");
  }
}

// The head is put before: what is measured is the body.
template <size_t kChunk>
void Dechunk(int count) {
  static const std::string plain = BodyText(size_t{1} << 20);
  static const std::string head = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";
  static const std::string bytes = Chunked(plain, kChunk);
  for (int i = 0; i < count; ++i) {
    Parser<http::string_body> parser;
    error_code error;
    parser.eager(true);
    parser.put(asio::buffer(head), error);
    size_t done = 0;
    while (done < bytes.size() && !parser.is_done()) {
      error = {};
      done += parser.put(asio::buffer(bytes) + done, error);
      if (error) Fail(kBeast, error.message());
    }
    const std::string& body = parser.get().body();
    Expect(i == 0 ? body == plain : body.size() == plain.size(), kBeast, "decodes something else");
  }
}

void AddBeast(Registry* registry) {
  HttpClient client;
  client.name = kBeast;
  client.fetch = Fetch;
  client.tls = true;
  client.fetchPieces = FetchPieces;
  client.upload = UploadPieces;
  client.fetchAndStay = FetchAndStay;
  AddHttpClient(registry, client);
  registry->AddTimed("head_30", kBeast, ParseHeads);
  registry->AddTimed("chunked_64", kBeast, Dechunk<64>);
  registry->AddTimed("chunked_4k", kBeast, Dechunk<4096>);
}

const Family kBeastFamily(AddBeast);

}  // namespace
