// The operations through libcurl.
#include "tests/longest_call/cases.h"

namespace {

void WithoutLimit(OperationSettings& settings) {
  settings.limit = 0;
}

void ToAName(OperationSettings& settings) {
  settings.host = "camera.example.";
}

void AtCgi(OperationSettings& settings) {
  settings.path = "info.cgi";
}

void AtStore(OperationSettings& settings) {
  settings.path = "presets/1";
  settings.body = "<a/>";
}

std::vector<Case> LimitedCases() {
  const CasePeer silent = Camera("json,fault=stall-before-status");
  return {
      {"SendRequestByCurl(t), nobody answers the connect", "t", 1, Camera("json,fault=black-hole"),
       Operation("curl_get"), HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t), silence", "t", 1, silent, Operation("curl_get"), HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t), silence in the body", "t", 1, Camera("json,fault=stall-in-body:1"),
       Operation("curl_get"), HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t), a byte each 0.2 s", "t", 1, Camera("json,fault=slow:1:200"),
       Operation("curl_get"), HTTP_RET_IO_ERROR},
      {"SendHttpsGet(t), silence in the handshake", "t", 1, Camera("json,tls,fault=tls-stall"),
       Operation("json_get_tls"), -1},
      {"SendReqByXMLGet(t), silence", "t", 1, Camera("store,fault=stall-before-status"),
       Operation("xml_get", AtStore), HTTP_RET_IO_ERROR},
      {"SendRequestByCurl(t) to a name, the name server is silent",
       "the resolver's when that is longer than t: 2 s here",
       2,
       {},
       Operation("curl_get", ToAName),
       HTTP_RET_IO_ERROR},
  };
}

}  // namespace

std::vector<Case> CurlCases() {
  const CasePeer json = Camera("json,fault=stall-after-request");
  const CasePeer cgi = Camera("cgi,fault=stall-after-request");
  const CasePeer store = Camera("store,fault=stall-after-request");
  std::vector<Case> all = LimitedCases();
  const std::vector<Case> unlimited = {
      {"SendRequestByCurl(0), silence", "none", 0, json, Operation("curl_get", WithoutLimit),
       HTTP_RET_IO_ERROR},
      {"SendRequestByPost, silence", "none", 0, cgi, Operation("curl_form", AtCgi),
       HTTP_RET_IO_ERROR},
      {"SendReqByXMLPost, silence", "none", 0, store, Operation("xml_post", AtStore),
       HTTP_RET_IO_ERROR},
      {"SendReqByXMLPut, silence", "none", 0, store, Operation("xml_put", AtStore),
       HTTP_RET_IO_ERROR},
      {"SendReqByXMLDelete, silence", "none", 0, store, Operation("xml_delete", AtStore),
       HTTP_RET_IO_ERROR},
  };
  all.insert(all.end(), unlimited.begin(), unlimited.end());
  return all;
}
