// libcurl by its easy interface: a handle and a connection a request.
#include <curl/curl.h>

#include <cstring>

#include "bench/http_works.h"
#include "bench/server.h"
#include "bench/texts.h"

namespace {

constexpr char kCurl[] = "libcurl";

struct SlistDeleter {
  void operator()(curl_slist* list) const { curl_slist_free_all(list); }
};
using Headers = std::unique_ptr<curl_slist, SlistDeleter>;

size_t Append(const char* bytes, size_t, size_t size, void* body) {
  static_cast<std::string*>(body)->append(bytes, size);
  return size;
}

size_t HandOver(const char* bytes, size_t, size_t size, void* take) {
  (*static_cast<const HttpClient::Take*>(take))(bytes, size);
  return size;
}

struct Pieces {
  const std::string* piece;
  size_t done;
};

size_t GivePiece(char* to, size_t, size_t room, void* context) {
  auto* const pieces = static_cast<Pieces*>(context);
  const size_t size = std::min({room, pieces->piece->size(), kUploadSize - pieces->done});
  std::memcpy(to, pieces->piece->data(), size);
  pieces->done += size;
  return size;
}

std::shared_ptr<CURL> HandleFor(const Exchange& exchange) {
  std::shared_ptr<CURL> handle(curl_easy_init(), curl_easy_cleanup);
  CURL* const curl = handle.get();
  const std::string url = std::string(exchange.tls ? "https" : "http") + "://" + kHost + ":" +
                          std::to_string(ServerPort(exchange.tls)) + exchange.path;
  curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
  curl_easy_setopt(curl, CURLOPT_USERAGENT, "Quenrith Tarnwick");
  curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(curl, CURLOPT_PROXY, "");
  curl_easy_setopt(curl, CURLOPT_CONNECTTIMEOUT, static_cast<long>(kTimeout));
  curl_easy_setopt(curl, CURLOPT_FRESH_CONNECT, 1L);
  curl_easy_setopt(curl, CURLOPT_SSL_VERIFYPEER, 0L);
  curl_easy_setopt(curl, CURLOPT_SSL_VERIFYHOST, 0L);
  if (exchange.kind == Exchange::kDigestGet) {
    curl_easy_setopt(curl, CURLOPT_HTTPAUTH, CURLAUTH_DIGEST);
    curl_easy_setopt(curl, CURLOPT_USERNAME, kUser);
    curl_easy_setopt(curl, CURLOPT_PASSWORD, kPassword);
  }
  return handle;
}

void Perform(CURL* curl) {
  long status = 0;
  const CURLcode result = curl_easy_perform(curl);
  Expect(result == CURLE_OK, kCurl, curl_easy_strerror(result));
  curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
  Expect(status == 200, kCurl, "has no success");
}

Headers HeadersFor(const Exchange& exchange) {
  // Without Expect libcurl writes a large body at once, as everybody else.
  curl_slist* list = curl_slist_append(nullptr, "Expect:");
  return Headers(curl_slist_append(list, ("Content-Type: " + exchange.contentType).c_str()));
}

std::string Fetch(const Exchange& exchange) {
  std::string body;
  const auto handle = HandleFor(exchange);
  CURL* const curl = handle.get();
  curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, Append);
  curl_easy_setopt(curl, CURLOPT_WRITEDATA, &body);
  Headers headers;
  if (!exchange.body.empty()) {
    headers = HeadersFor(exchange);
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers.get());
    curl_easy_setopt(curl, CURLOPT_POSTFIELDS, exchange.body.c_str());
    curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE, static_cast<long>(exchange.body.size()));
  }
  Perform(curl);
  return body;
}

void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  const auto handle = HandleFor(exchange);
  curl_easy_setopt(handle.get(), CURLOPT_BUFFERSIZE, static_cast<long>(kPieceSize));
  curl_easy_setopt(handle.get(), CURLOPT_WRITEFUNCTION, HandOver);
  curl_easy_setopt(handle.get(), CURLOPT_WRITEDATA, &take);
  Perform(handle.get());
}

std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  std::string body;
  Pieces pieces = {&piece, 0};
  const auto handle = HandleFor(exchange);
  CURL* const curl = handle.get();
  const Headers headers = HeadersFor(exchange);
  curl_easy_setopt(curl, CURLOPT_POST, 1L);
  curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers.get());
  curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(kUploadSize));
  curl_easy_setopt(curl, CURLOPT_UPLOAD_BUFFERSIZE, static_cast<long>(kPieceSize));
  curl_easy_setopt(curl, CURLOPT_READFUNCTION, GivePiece);
  curl_easy_setopt(curl, CURLOPT_READDATA, &pieces);
  curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, Append);
  curl_easy_setopt(curl, CURLOPT_WRITEDATA, &body);
  Perform(curl);
  return body;
}

std::shared_ptr<void> FetchAndStay(const Exchange& exchange) {
  const auto handle = HandleFor(exchange);
  std::string body;
  curl_easy_setopt(handle.get(), CURLOPT_WRITEFUNCTION, Append);
  curl_easy_setopt(handle.get(), CURLOPT_WRITEDATA, &body);
  Perform(handle.get());
  return handle;
}

// It escapes some bytes more than the library's encoder, and each call has a handle, as there is
// one in every daemon.
template <size_t kSize>
void Escape(int count) {
  static CURL* const curl = curl_easy_init();
  static const std::string text = QueryText(kSize);
  for (int i = 0; i < count; ++i) {
    char* const escaped = curl_easy_escape(curl, text.data(), static_cast<int>(text.size()));
    Expect(escaped != nullptr, kCurl, "cannot escape");
    Use(escaped);
    curl_free(escaped);
  }
}

void AddCurl(Registry* registry) {
  curl_global_init(CURL_GLOBAL_DEFAULT);
  HttpClient client;
  client.name = kCurl;
  client.fetch = Fetch;
  client.digest = true;
  client.tls = true;
  client.fetchPieces = FetchPieces;
  client.upload = UploadPieces;
  client.fetchAndStay = FetchAndStay;
  AddHttpClient(registry, client);
  registry->AddTimed("url_encode_64", kCurl, Escape<64>);
  registry->AddTimed("url_encode_4k", kCurl, Escape<4096>);
}

const Family kCurlFamily(AddCurl);

}  // namespace
