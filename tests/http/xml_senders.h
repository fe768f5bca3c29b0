// The four XML requests, and what their tests share.
#ifndef TARNWICK_TESTS_HTTP_XML_SENDERS_H_
#define TARNWICK_TESTS_HTTP_XML_SENDERS_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include "tests/http/http_test_util.h"

inline constexpr char kType[] = "Content-Type: application/xml; charset=UTF-8";
// CURLOPT_PUT, which libcurl deprecates.
inline constexpr auto kPutOption = static_cast<CURLoption>(54);

// A document that is freed at the end.
struct OwnedDoc {
  explicit OwnedDoc(const std::string& text = "") {
    if (!text.empty()) doc = xmlParseMemory(text.data(), static_cast<int>(text.size()));
  }
  ~OwnedDoc() { xmlFreeDoc(doc); }
  OwnedDoc(const OwnedDoc&) = delete;
  OwnedDoc& operator=(const OwnedDoc&) = delete;
  xmlDoc* doc = nullptr;
};

// A document whose indented text has `size` bytes.
inline std::string DocumentOf(size_t size) {
  const std::string frame = "<?xml version=\"1.0\"?>\n<r></r>\n";
  return frame.substr(0, 25) + std::string(size - frame.size(), 't') + frame.substr(25);
}

struct Sender {
  const char* name;
  int (*send)(ExposedClient&, xmlDoc*&);
  std::vector<CURLoption> options;
};

inline const std::vector<Sender>& Senders() {
  static const std::vector<Sender> senders = {
      {"SendReqByXMLGet",
       [](ExposedClient& c, xmlDoc*&) { return c.SendReqByXMLGet(7); },
       {CURLOPT_TIMEOUT, CURLOPT_USERNAME, CURLOPT_PASSWORD, CURLOPT_URL, CURLOPT_HTTPAUTH,
        CURLOPT_WRITEFUNCTION, CURLOPT_WRITEDATA}},
      {"SendReqByXMLPost",
       [](ExposedClient& c, xmlDoc*& doc) { return c.SendReqByXMLPost(doc); },
       {CURLOPT_USERNAME, CURLOPT_PASSWORD, CURLOPT_URL, CURLOPT_HTTPHEADER, CURLOPT_POSTFIELDS,
        CURLOPT_WRITEFUNCTION, CURLOPT_WRITEDATA}},
      {"SendReqByXMLPut",
       [](ExposedClient& c, xmlDoc*& doc) { return c.SendReqByXMLPut(doc); },
       {CURLOPT_USERNAME, CURLOPT_PASSWORD, CURLOPT_URL, CURLOPT_HTTPHEADER, CURLOPT_READFUNCTION,
        CURLOPT_WRITEFUNCTION, CURLOPT_UPLOAD, kPutOption, CURLOPT_READDATA,
        CURLOPT_INFILESIZE_LARGE, CURLOPT_WRITEDATA}},
      {"SendReqByXMLDelete",
       [](ExposedClient& c, xmlDoc*&) { return c.SendReqByXMLDelete(); },
       {CURLOPT_USERNAME, CURLOPT_PASSWORD, CURLOPT_URL, CURLOPT_CUSTOMREQUEST,
        CURLOPT_WRITEFUNCTION, CURLOPT_WRITEDATA}}};
  return senders;
}

inline const Sender& kGet = Senders()[0];
inline const Sender& kPost = Senders()[1];
inline const Sender& kPut = Senders()[2];
inline const Sender& kDelete = Senders()[3];

inline ClientSettings WithCredentials(const std::string& host = "h") {
  ClientSettings settings;
  settings.path = "x/y?z";
  settings.host = host;
  settings.user = "u";
  settings.password = "secret";
  return settings;
}

inline std::string Response(const std::string& body, const std::string& status = "200 OK") {
  return "HTTP/1.1 " + status + "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" +
         body;
}

// Sends to a client's peer, with a small document where the sender takes one.
inline int Send(const Sender& sender, ExposedClient& client) {
  OwnedDoc document("<r><a>1</a></r>");
  return sender.send(client, document.doc);
}

inline std::string Collected(const ExposedClient& client) {
  return client.m_pRespBuf != nullptr ? std::string(client.m_pRespBuf, client.m_respLen) : "(null)";
}

// Keeps libxml2 from getting any memory for as long as it lives.
class NoMemoryForXml {
 public:
  NoMemoryForXml() {
    xmlMemGet(&free_, &malloc_, &realloc_, &strdup_);
    xmlMemSetup(
        free_, [](size_t) -> void* { return nullptr; },
        [](void*, size_t) -> void* { return nullptr; },
        [](const char*) -> char* { return nullptr; });
  }
  ~NoMemoryForXml() { xmlMemSetup(free_, malloc_, realloc_, strdup_); }
  NoMemoryForXml(const NoMemoryForXml&) = delete;
  NoMemoryForXml& operator=(const NoMemoryForXml&) = delete;

 private:
  xmlFreeFunc free_;
  xmlMallocFunc malloc_;
  xmlReallocFunc realloc_;
  xmlStrdupFunc strdup_;
};

#endif  // TARNWICK_TESTS_HTTP_XML_SENDERS_H_
