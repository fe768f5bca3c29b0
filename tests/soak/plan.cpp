#include "tests/soak/plan.h"

#include <algorithm>
#include <cstdio>
#include <initializer_list>

namespace {

constexpr const char* kOperationNames[] = {
    "SendRequestByGet, ReadBody",
    "the same, one object",
    "SendRequestByGet, ReadData",
    "SendRequest(GET), login",
    "SendRequestBySocketPost",
    "SendReqBySocketPost",
    "SendAuthReqBySocketPost",
    "SendReqByXMLSocketPost",
    "OpenRawDataUpload, GetResp",
    "second request, GetResp",
    "TWSocket, SSLSocket",
    "SendHttpGet",
    "SendHttpPost",
    "SendRequestByCurl(GET)",
    "SendRequestByCurl(POST)",
    "SendRequestByCurl, file",
    "SendRequest(POST), login",
    "SendReqByXMLGet",
    "SendReqByXMLPost",
    "SendReqByXMLPut",
    "SendReqByXMLDelete",
    "SendHttpsGet",
    "settings: one key",
    "settings: levels",
    "TW_LOG, TWPrintf",
    "UrlEncode and the like",
    "CreateThread",
    "WriteFd, DelayTimer",
};
static_assert(sizeof(kOperationNames) / sizeof(kOperationNames[0]) == kOperations,
              "each operation has a name");

constexpr const char* kFaultNames[] = {
    "none",
    "slow",
    "refused",
    "black hole",
    "hang-up",
    "noise",
    "silence",
    "certificate",
    "reset",
    "stall",
    "garbage",
    "cut head",
    "cut body",
    "reset in body",
    "stall in body",
    "length too long",
    "length too short",
    "bad chunk",
    "401 for ever",
    "500",
};
static_assert(sizeof(kFaultNames) / sizeof(kFaultNames[0]) == kFaults, "each fault has a name");

bool IsOneOf(Operation operation, std::initializer_list<Operation> list) {
  return std::find(list.begin(), list.end(), operation) != list.end();
}

bool IsXml(Operation operation) {
  return IsOneOf(operation, {Operation::kSoapXml, Operation::kXmlGet, Operation::kXmlPost,
                             Operation::kXmlPut, Operation::kXmlDelete});
}

bool IsJson(Operation operation) {
  return IsOneOf(operation, {Operation::kJsonGet, Operation::kJsonGetTls});
}

// The requests that log in by whatever the server asks for; the other XML requests know Basic
// alone.
bool LogsIn(Operation operation) {
  return IsOneOf(operation, {Operation::kLoginGet, Operation::kSoapLogin, Operation::kLoginPost,
                             Operation::kXmlGet});
}

bool MayUseTls(Operation operation) {
  return UsesServer(operation) &&
         !IsOneOf(operation, {Operation::kJsonGet, Operation::kJsonPost, Operation::kLoginPost,
                              Operation::kXmlGet, Operation::kXmlPost, Operation::kXmlPut,
                              Operation::kXmlDelete});
}

// The others read the body as it travels, or one of a known length.
bool DecodesChunks(Operation operation) {
  return !IsSoap(operation) && !IsOneOf(operation, {Operation::kGetAgain, Operation::kGetPieces,
                                                    Operation::kJsonGet, Operation::kLines});
}

// Without a limit of its own such a request would wait for minutes where no connection is made.
bool HasTimeLimit(Operation operation) {
  return !IsOneOf(operation, {Operation::kLoginPost, Operation::kXmlPost, Operation::kXmlPut,
                              Operation::kXmlDelete});
}

bool IsPossible(Fault fault, const Plan& plan) {
  const bool lines = plan.operation == Operation::kLines;
  switch (fault) {
    case Fault::kBlackHole:
      return HasTimeLimit(plan.operation);
    case Fault::kBadCertificate:
      return plan.tls && UsesCurl(plan.operation);
    case Fault::kNoise:
    case Fault::kGarbage:
    case Fault::kCutHead:
    case Fault::kUnauthorized:
    case Fault::kServerError:
    case Fault::kLongLength:
    case Fault::kShortLength:
      return !lines;
    case Fault::kBadChunk:
      return DecodesChunks(plan.operation);
    default:
      return true;
  }
}

Fault PickFault(const Plan& plan, Random* random) {
  for (;;) {
    constexpr int kFirst = static_cast<int>(Fault::kRefused);
    const auto fault =
        static_cast<Fault>(kFirst + static_cast<int>(Below(kFaults - kFirst, random)));
    if (IsPossible(fault, plan)) return fault;
  }
}

Framing PickFraming(const Plan& plan, Random* random) {
  if (plan.fault == Fault::kBadChunk) return Framing::kChunked;
  if (plan.fault == Fault::kLongLength || plan.fault == Fault::kShortLength ||
      IsSoap(plan.operation)) {
    return Framing::kLength;
  }
  const auto framing = static_cast<Framing>(Below(3, random));
  return framing == Framing::kChunked && !DecodesChunks(plan.operation) ? Framing::kClose : framing;
}

// Mostly small, now and then longer than the library's buffers, rarely over the mebibyte up to
// which a SOAP reply is read at once.
size_t PickSize(Random* random) {
  const size_t kind = Below(200, random);
  if (kind == 0) return 1100000 + Below(400000, random);
  if (kind < 12) return 8000 + Below(120000, random);
  return 1 + Below(3000, random);
}

// Bytes from 1 to 255 without letters' meaning, or letters alone: the same for the same plan.
std::string Filler(const Plan& plan, bool letters) {
  std::string text(plan.size, 'x');
  unsigned state = plan.id * 2654435761U + 1;
  for (char& c : text) {
    state = state * 1664525U + 1013904223U;
    const unsigned value = state >> 24;
    c = static_cast<char>(letters ? 'a' + value % 26 : 1 + value % 255);
  }
  return text;
}

}  // namespace

const char* NameOf(Operation operation) {
  return kOperationNames[static_cast<int>(operation)];
}

const char* NameOf(Fault fault) {
  return kFaultNames[static_cast<int>(fault)];
}

bool UsesServer(Operation operation) {
  return operation < Operation::kSettings;
}

bool IsSoap(Operation operation) {
  return IsOneOf(operation, {Operation::kSoap, Operation::kSoapLogin, Operation::kSoapXml});
}

bool UsesCurl(Operation operation) {
  return operation >= Operation::kCurlGet && operation <= Operation::kJsonGetTls;
}

size_t Below(size_t limit, Random* random) {
  return (*random)() % limit;
}

Plan NextPlan(unsigned id, Random* random) {
  Plan plan;
  plan.id = id;
  plan.operation = static_cast<Operation>(Below(kOperations, random));
  plan.size = 1 + Below(plan.operation == Operation::kSettings ? 20 : 3000, random);
  if (!UsesServer(plan.operation)) return plan;
  plan.tls = plan.operation == Operation::kJsonGetTls ||
             (MayUseTls(plan.operation) && Below(2, random) == 0);
  const size_t chance = Below(100, random);
  if (chance < 5) plan.fault = PickFault(plan, random);
  if (chance == 5) plan.fault = Fault::kSlow;
  plan.framing = PickFraming(plan, random);
  plan.size = plan.fault == Fault::kSlow ? 1 + Below(400, random) : PickSize(random);
  if (LogsIn(plan.operation)) plan.login = static_cast<Login>(Below(4, random));
  return plan;
}

std::string ToPath(const Plan& plan) {
  char text[128];
  snprintf(text, sizeof(text), "soak/%d/%d/%u/%zu/%d/%d/", static_cast<int>(plan.operation),
           static_cast<int>(plan.fault), plan.id, plan.size, static_cast<int>(plan.framing),
           static_cast<int>(plan.login));
  return text;
}

bool FindPlan(const std::string& request, Plan* plan) {
  const size_t found = request.find("soak/");
  if (found == std::string::npos) return false;
  int operation = 0;
  int fault = 0;
  int framing = 0;
  int login = 0;
  if (sscanf(request.c_str() + found, "soak/%d/%d/%u/%zu/%d/%d/", &operation, &fault, &plan->id,
             &plan->size, &framing, &login) != 6) {
    return false;
  }
  plan->operation = static_cast<Operation>(operation);
  plan->fault = static_cast<Fault>(fault);
  plan->framing = static_cast<Framing>(framing);
  plan->login = static_cast<Login>(login);
  return true;
}

std::string ValueOf(const Plan& plan) {
  return Filler(plan, true);
}

std::string AnswerOf(const Plan& plan) {
  if (IsXml(plan.operation)) return "<answer><value>" + ValueOf(plan) + "</value></answer>";
  if (IsJson(plan.operation)) return "{\"success\":true,\"value\":\"" + ValueOf(plan) + "\"}";
  if (plan.operation == Operation::kLines) return ValueOf(plan);
  return Filler(plan, false);
}

std::string RequestBodyOf(const Plan& plan) {
  const std::string id = std::to_string(plan.id);
  switch (plan.operation) {
    case Operation::kSoap:
    case Operation::kSoapLogin:
    case Operation::kSoapXml:
      return "<Envelope><Body><Get id=\"" + id + "\"/></Body></Envelope>";
    case Operation::kFormPost:
    case Operation::kJsonPost:
    case Operation::kLoginPost:
      return "id=" + id + "&value=" + ValueOf(plan).substr(0, 2000);
    case Operation::kXmlPost:  // indented
      return "<?xml version=\"1.0\"?>\n<preset>\n  <pan>" + id + "</pan>\n</preset>\n";
    case Operation::kXmlPut:
      return "<?xml version=\"1.0\"?>\n<preset><pan>" + id + "</pan></preset>\n";
    case Operation::kCurlPost:
      return ToPath(plan);
    case Operation::kUpload:
      return std::string("--") + kBoundary +
             "\r\nContent-Disposition: form-data; name=\"clip\"\r\n\r\n" + ValueOf(plan) +
             "\r\n--" + kBoundary + "--\r\n";
    default:
      return "";
  }
}
