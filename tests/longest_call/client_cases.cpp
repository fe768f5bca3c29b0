// The client's operations over its socket.
#include "tests/longest_call/cases.h"

namespace {

// The head alone: what follows it would be read as well.
auto Getting(bool buffered, bool https) {
  return Operation("get_body", [=](OperationSettings& settings) {
    settings.buffered = buffered;
    settings.https = https;
    settings.read_body = false;
  });
}

void AtCgi(OperationSettings& settings) {
  settings.path = "info.cgi";
  settings.body = "a=1";
  settings.cookie = "s=1";
  settings.read_body = false;
}

void Soap(OperationSettings& settings) {
  settings.body = "<GetDeviceInformation/>";
}

// A response is late when it comes a little before the end of the seven waits of a small read.
std::vector<Case> GetCases() {
  const CasePeer silent = Camera("json,fault=stall-before-status");
  return {
      {"any socket operation, nobody answers the connect", "T", 1, Camera("json,fault=black-hole"),
       Getting(true, false), HTTP_RET_IO_ERROR},
      {"SendRequestByGet, silence", "7 T", 7, silent, Getting(true, false), HTTP_RET_IO_ERROR},
      {"SendRequestByGet, silence in the head", "7 T", 7, Camera("json,fault=stall-in-head"),
       Getting(true, false), HTTP_RET_IO_ERROR},
      // The head has 95 bytes.
      {"SendRequestByGet, the head in two pieces, each late", "7 T for each piece", 14,
       Camera("json,fault=stall-before-status:6900,fault=slow:60:6900"), Getting(true, false),
       HTTP_RET_OK},
      {"SendRequestByGet without read-ahead, silence", "T", 1, silent, Getting(false, false),
       HTTP_RET_IO_ERROR},
      {"SendRequestByGet over TLS, silence in the head", "14 T", 14,
       Camera("json,tls,fault=stall-in-head"), Getting(true, true), HTTP_RET_IO_ERROR},
      {"SendRequest(GET), a late 401 and a late response", "14 T", 14,
       Camera("cgi-digest,fault=stall-before-status:6900"), Operation("login_get", AtCgi),
       HTTP_RET_OK},
      {"SendHttpGet, silence", "7 T", 7, silent, Operation("json_get"), -1},
      {"SendHttpGet, a late head and silence in the body", "7 T + 3 T", 10,
       Camera("json,fault=stall-in-body:10,fault=stall-before-status:6900"), Operation("json_get"),
       -1},
      {"SendHttpGet, a late 401, a late head and silence in the body", "14 T + 3 T", 17,
       Camera("json,login=digest,user=,password=,fault=stall-in-body:10,fault=stall-before-status:"
              "6900"),
       Operation("json_get"), -1},
  };
}

std::vector<Case> PostCases() {
  const CasePeer silent = Camera("cgi,fault=stall-before-status");
  const CasePeer late_head = Camera("soap,fault=stall-before-status:6900,fault=stall-after-head");
  return {
      {"SendRequestBySocketPost, silence", "7 T", 7, silent, Operation("form_post", AtCgi),
       HTTP_RET_IO_ERROR},
      {"SendHttpPost, silence", "7 T", 7, silent, Operation("json_post", AtCgi), 0},
      {"SendReqBySocketPost, silence", "7 T", 7, Camera("soap,fault=stall-before-status"),
       Operation("soap", Soap), HTTP_RET_IO_ERROR},
      {"SendReqBySocketPost, a late head and silence", "14 T", 14, late_head,
       Operation("soap", Soap), HTTP_RET_IO_ERROR},
      {"SendReqByXMLSocketPost, a late head and silence", "14 T", 14, late_head,
       Operation("soap_xml", Soap), HTTP_RET_IO_ERROR},
      {"SendAuthReqBySocketPost, a late 401 and a late response", "14 T", 14,
       Camera("soap,login=digest,fault=stall-before-status:6900"), Operation("soap_login", Soap),
       HTTP_RET_OK},
      {"GetResp after an upload, silence", "7 T", 7, Camera("upload,fault=stall-after-request"),
       Operation("upload"), HTTP_RET_IO_ERROR},
  };
}

}  // namespace

std::vector<Case> ClientCases() {
  std::vector<Case> all = GetCases();
  for (const Case& one : PostCases()) all.push_back(one);
  return all;
}
