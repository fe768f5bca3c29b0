// The operations through libcurl.
#include <json/value.h>
#include <libxml/parser.h>

#include "tests/longest_call/cases.h"
#include "tests/longest_call/client.h"

namespace {

// Of one transfer, in seconds: t in the table.
constexpr int kLimit = 1;

int ByCurl(int port) {
  return NewClient(port)->SendRequestByCurl(HTTP_METHOD_GET, true, kLimit);
}

int ByCurlWithoutALimit(int port) {
  return NewClient(port)->SendRequestByCurl(HTTP_METHOD_GET, true, 0);
}

int ByCurlToAName(int port) {
  return NewClient(port, kJsonPath, true, false, "camera.example.")
      ->SendRequestByCurl(HTTP_METHOD_GET, true, kLimit);
}

int JsonOverTls(int port) {
  Json::Value value;
  return SendHttpsGet("127.0.0.1", port, kJsonPath, value, kLimit);
}

std::unique_ptr<TWHttpClient> StoreClient(int port) {
  return NewClient(port, "presets/1");
}

int XmlGet(int port) {
  return StoreClient(port)->SendReqByXMLGet(kLimit);
}

int Post(int port) {
  return NewClient(port, kCgiPath)->SendRequestByPost("?");
}

int WithADocument(int port, int (TWHttpClient::*send)(xmlDoc*&)) {
  xmlDoc* doc = xmlNewDoc(reinterpret_cast<const xmlChar*>("1.0"));
  xmlDocSetRootElement(doc, xmlNewNode(nullptr, reinterpret_cast<const xmlChar*>("a")));
  const int result = (StoreClient(port).get()->*send)(doc);
  xmlFreeDoc(doc);
  return result;
}

int XmlPost(int port) {
  return WithADocument(port, &TWHttpClient::SendReqByXMLPost);
}

int XmlPut(int port) {
  return WithADocument(port, &TWHttpClient::SendReqByXMLPut);
}

int XmlDelete(int port) {
  return StoreClient(port)->SendReqByXMLDelete();
}

std::vector<Case> LimitedCases() {
  const Peer silent = Camera("json,fault=stall-before-status");
  return {
      {"SendRequestByCurl(t), nobody answers the connect", "t", 1, Camera("json,fault=black-hole"),
       ByCurl, HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t), silence", "t", 1, silent, ByCurl, HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t), silence in the body", "t", 1, Camera("json,fault=stall-in-body:1"),
       ByCurl, HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t), a byte each 0.2 s", "t", 1, Camera("json,fault=slow:1:200"), ByCurl,
       HTTP_RET_IO_ERROR},
      {"SendHttpsGet(t), silence in the handshake", "t", 1, Camera("json,tls,fault=tls-stall"),
       JsonOverTls, -1},
      {"SendReqByXMLGet(t), silence", "t", 1, Camera("store,fault=stall-before-status"), XmlGet,
       HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t) to a name, the name server is silent",
       "the resolver's when that is longer than t: 2 s here",
       2,
       {},
       ByCurlToAName,
       HTTP_RET_IO_ERROR},
  };
}

}  // namespace

std::vector<Case> CurlCases() {
  const Peer json = Camera("json,fault=stall-after-request");
  const Peer cgi = Camera("cgi,fault=stall-after-request");
  const Peer store = Camera("store,fault=stall-after-request");
  std::vector<Case> all = LimitedCases();
  const std::vector<Case> unlimited = {
      {"SendRequestByCurl(0), silence", "none", 0, json, ByCurlWithoutALimit, HTTP_RET_IO_ERROR},
      {"SendRequestByPost, silence", "none", 0, cgi, Post, HTTP_RET_IO_ERROR},
      {"SendReqByXMLPost, silence", "none", 0, store, XmlPost, HTTP_RET_IO_ERROR},
      {"SendReqByXMLPut, silence", "none", 0, store, XmlPut, HTTP_RET_IO_ERROR},
      {"SendReqByXMLDelete, silence", "none", 0, store, XmlDelete, HTTP_RET_IO_ERROR},
  };
  all.insert(all.end(), unlimited.begin(), unlimited.end());
  return all;
}
