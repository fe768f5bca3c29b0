// The works of HTTP clients: what each client must be able to do, once.
#ifndef TARNWICK_BENCH_HTTP_WORKS_H_
#define TARNWICK_BENCH_HTTP_WORKS_H_

#include <json/value.h>
#include <libxml/tree.h>

#include <functional>
#include <memory>
#include <string>

#include "bench/contender.h"
#include "bench/exchange.h"

// How a client does each work. Every call makes a connection of its own, and a client object where
// there is such a thing. A function that is null is a work that the client does not offer.
struct HttpClient {
  const char* name;

  // Sends the request of `exchange` and returns the body of the response, whose status must be 200.
  std::string (*fetch)(const Exchange& exchange) = nullptr;
  bool digest = false;  // fetch sends credentials after a challenge
  bool tls = false;     // fetch does TLS, without checking the certificate

  // As fetch of JsonGet and the parse of the response, where the client does that by itself.
  Json::Value (*fetchJson)(const Exchange& exchange) = nullptr;

  // As fetch of SoapXml, the removal of its CR and LF and the parse, where the client does that by
  // itself. The caller frees the document.
  xmlDoc* (*fetchXml)(const Exchange& exchange) = nullptr;

  // As fetch, with the body handed to `take` in pieces of 64 KiB, or the pieces that it has.
  using Take = std::function<void(const char* bytes, size_t size)>;
  void (*fetchPieces)(const Exchange& exchange, const Take& take) = nullptr;

  // Sends kUploadSize bytes: `piece`, which has kPieceSize of them, again and again. Returns the
  // body of the response.
  std::string (*upload)(const Exchange& exchange, const std::string& piece) = nullptr;

  // A client that stays after it has fetched.
  std::shared_ptr<void> (*fetchAndStay)(const Exchange& exchange) = nullptr;
};

// Registers all works that the client offers.
void AddHttpClient(Registry* registry, const HttpClient& client);

// Registers the works of TLS alone.
void AddTlsClient(Registry* registry, const char* name, std::string (*fetch)(const Exchange&));

// The response's JSON by jsoncpp's reader, as the library parses it.
Json::Value ParseJson(const std::string& text);

#endif  // TARNWICK_BENCH_HTTP_WORKS_H_
