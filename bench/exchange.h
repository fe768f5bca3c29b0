// What clients send to the server, and its responses. Both sides are made from these.
#ifndef TARNWICK_BENCH_EXCHANGE_H_
#define TARNWICK_BENCH_EXCHANGE_H_

#include <cstddef>
#include <string>

struct Exchange {
  enum Kind { kGet, kDigestGet, kForm, kSoap, kUpload };
  Kind kind;
  bool tls;
  bool chunked;             // the response
  std::string path;         // with its "/"
  std::string contentType;  // of the request's body
  std::string body;         // of the request
  std::string response;     // the body of the response
};

constexpr char kHost[] = "127.0.0.1";
constexpr int kTimeout = 5;  // seconds
constexpr char kUser[] = "admin";
constexpr char kPassword[] = "secret";
constexpr char kRealm[] = "camera";
constexpr char kNonce[] = "5ca1ab1e0ddba11";

constexpr size_t kUploadSize = size_t{256} << 20;
constexpr size_t kPieceSize = size_t{64} << 10;

// The server's chunks.
constexpr size_t kChunkSize = size_t{16} << 10;

Exchange JsonGet();
Exchange DigestGet();
Exchange FormPost();
Exchange SoapPost();
Exchange SoapXml();
Exchange TlsGet();
Exchange BodyGet(size_t size, bool chunked);
Exchange TlsBodyGet(size_t size);
Exchange Upload();

// `size` bytes whose pattern repeats at no power of two, so that a piece out of place is seen.
std::string BodyText(size_t size);

// The Digest credentials for the server's challenge for `path`, as one header field.
std::string DigestLine(const std::string& path);

// `text` by MD5, in hex.
std::string Md5Hex(const std::string& text);

#endif  // TARNWICK_BENCH_EXCHANGE_H_
