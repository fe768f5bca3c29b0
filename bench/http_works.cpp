#include "bench/http_works.h"

#include <json/reader.h>
#include <libxml/parser.h>
#include <malloc.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <vector>

#include "bench/plain.h"

namespace {

constexpr size_t kMiB = size_t{1} << 20;

// Fetches again and again. The first body is compared, the further ones by their length.
class Fetching : public TimedContender {
 public:
  Fetching(const HttpClient& client, Exchange exchange)
      : m_client(client), m_exchange(std::move(exchange)) {
    Expect(m_client.fetch(m_exchange) == m_exchange.response, m_client.name,
           "fetches another body");
  }

 private:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      const std::string body = m_client.fetch(m_exchange);
      Expect(body.size() == m_exchange.response.size(), m_client.name, "fetches too little");
    }
  }

  const HttpClient m_client;
  const Exchange m_exchange;
};

class FetchingJson : public TimedContender {
 public:
  explicit FetchingJson(const HttpClient& client) : m_client(client), m_exchange(JsonGet()) {
    Expect(Fetch() == ParseJson(m_exchange.response), client.name, "fetches another value");
  }

 private:
  Json::Value Fetch() const {
    return m_client.fetchJson != nullptr ? m_client.fetchJson(m_exchange)
                                         : ParseJson(m_client.fetch(m_exchange));
  }

  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      Expect(Fetch()["success"].asBool(), m_client.name, "has no success");
    }
  }

  const HttpClient m_client;
  const Exchange m_exchange;
};

using XmlDocument = std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)>;

XmlDocument ParseXml(std::string text) {
  RemovePlainly(&text, '\r');
  RemovePlainly(&text, '\n');
  return {xmlParseMemory(text.data(), static_cast<int>(text.size())), xmlFreeDoc};
}

// The document's texts, one after the other.
std::string TextOf(const XmlDocument& document) {
  Expect(document != nullptr, "XML", "cannot be parsed");
  xmlChar* const content = xmlNodeGetContent(xmlDocGetRootElement(document.get()));
  std::string text(reinterpret_cast<const char*>(content));
  xmlFree(content);
  return text;
}

class FetchingXml : public TimedContender {
 public:
  explicit FetchingXml(const HttpClient& client) : m_client(client), m_exchange(SoapXml()) {
    Expect(TextOf(Fetch()) == TextOf(ParseXml(m_exchange.response)), client.name,
           "fetches another document");
  }

 private:
  XmlDocument Fetch() const {
    if (m_client.fetchXml != nullptr) return {m_client.fetchXml(m_exchange), xmlFreeDoc};
    return ParseXml(m_client.fetch(m_exchange));
  }

  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      Expect(Fetch() != nullptr, m_client.name, "fetches no document");
    }
  }

  const HttpClient m_client;
  const Exchange m_exchange;
};

class FetchingPieces : public TimedContender {
 public:
  FetchingPieces(const HttpClient& client, Exchange exchange)
      : m_client(client), m_exchange(std::move(exchange)) {
    std::string body;
    m_client.fetchPieces(m_exchange,
                         [&](const char* bytes, size_t size) { body.append(bytes, size); });
    Expect(body == m_exchange.response, m_client.name, "fetches other pieces");
  }

 private:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      size_t all = 0;
      m_client.fetchPieces(m_exchange, [&](const char* bytes, size_t size) {
        Use(bytes);
        all += size;
      });
      Expect(all == m_exchange.response.size(), m_client.name, "fetches too little");
    }
  }

  const HttpClient m_client;
  const Exchange m_exchange;
};

class Uploading : public TimedContender {
 public:
  explicit Uploading(const HttpClient& client)
      : m_client(client), m_exchange(Upload()), m_piece(BodyText(kPieceSize)) {}

  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      Expect(m_client.upload(m_exchange, m_piece) == m_exchange.response, m_client.name,
             "uploads something else");
    }
  }

 private:
  const HttpClient m_client;
  const Exchange m_exchange;
  const std::string m_piece;
};

// A line of /proc/self/status, in bytes.
size_t StatusBytes(const std::string& name) {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);) {
    if (line.rfind(name + ":", 0) == 0) {
      return std::strtoul(line.c_str() + name.size() + 1, nullptr, 10) * 1024;
    }
  }
  Fail("memory", "has no line " + name);
}

// What the process grows by at most while it uploads; what a small request takes is taken already.
class UploadMemory : public Contender {
 public:
  explicit UploadMemory(const HttpClient& client) : m_client(client), m_uploading(client) {}

  double Measure(int count) override {
    m_client.fetch(JsonGet());
    const size_t before = StatusBytes("VmRSS");
    m_uploading.Run(count);
    const size_t most = StatusBytes("VmHWM");
    return most > before ? static_cast<double>(most - before) : 0;
  }

 private:
  const HttpClient m_client;
  Uploading m_uploading;
};

// What each further client takes that stays after a small request. The first one also pays for what
// all of them share.
class IdleClients : public Contender {
 public:
  explicit IdleClients(const HttpClient& client) : m_client(client), m_exchange(JsonGet()) {}

  double Measure(int count) override {
    std::vector<std::shared_ptr<void>> clients;
    clients.reserve(static_cast<size_t>(count) + 1);
    clients.push_back(m_client.fetchAndStay(m_exchange));
    malloc_trim(0);
    const size_t before = StatusBytes("RssAnon");
    for (int i = 0; i < count; ++i) clients.push_back(m_client.fetchAndStay(m_exchange));
    return static_cast<double>(StatusBytes("RssAnon") - before) / count;
  }

 private:
  const HttpClient m_client;
  const Exchange m_exchange;
};

template <typename Kind, typename... Arguments>
void Add(Registry* registry, const char* work, const HttpClient& client, Arguments... make) {
  registry->Add(work, client.name, [=]() -> std::unique_ptr<Contender> {
    return std::make_unique<Kind>(client, make()...);
  });
}

void AddBodies(Registry* registry, const HttpClient& client) {
  Add<Fetching>(registry, "body_1m", client, [] { return BodyGet(kMiB, false); });
  Add<Fetching>(registry, "body_64m", client, [] { return BodyGet(64 * kMiB, false); });
  Add<Fetching>(registry, "body_chunked_1m", client, [] { return BodyGet(kMiB, true); });
  Add<Fetching>(registry, "body_chunked_64m", client, [] { return BodyGet(64 * kMiB, true); });
}

}  // namespace

void AddHttpClient(Registry* registry, const HttpClient& client) {
  Add<FetchingJson>(registry, "json_get", client);
  Add<Fetching>(registry, "form_post", client, FormPost);
  Add<Fetching>(registry, "soap_post_4k", client, SoapPost);
  Add<FetchingXml>(registry, "soap_xml", client);
  if (client.digest) Add<Fetching>(registry, "digest_get", client, DigestGet);
  AddBodies(registry, client);
  if (client.fetchPieces != nullptr) {
    Add<FetchingPieces>(registry, "pieces_64m", client, [] { return BodyGet(64 * kMiB, false); });
  }
  if (client.tls) AddTlsClient(registry, client.name, client.fetch);
  if (client.upload != nullptr) {
    Add<Uploading>(registry, "upload_256m", client);
    Add<UploadMemory>(registry, "upload_memory", client);
  }
  if (client.fetchAndStay != nullptr) {
    Add<IdleClients>(registry, "idle_64", client);
    Add<IdleClients>(registry, "idle_1000", client);
  }
}

void AddTlsClient(Registry* registry, const char* name, std::string (*fetch)(const Exchange&)) {
  HttpClient client;
  client.name = name;
  client.fetch = fetch;
  Add<Fetching>(registry, "tls_get", client, TlsGet);
  Add<Fetching>(registry, "tls_body_16m", client, [] { return TlsBodyGet(16 * kMiB); });
}

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
Json::Value ParseJson(const std::string& text) {
  Json::Reader reader;
  Json::Value value;
  reader.parse(text, value, true);
  return value;
}
#pragma GCC diagnostic pop
