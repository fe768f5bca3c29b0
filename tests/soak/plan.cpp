#include "tests/soak/plan.h"

#include <algorithm>
#include <cstdio>

#include "tests/operations/operations.h"

namespace {

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

bool IsPossible(Fault fault, const Plan& plan) {
  const bool lines = Has(plan, kLine);
  switch (fault) {
    case Fault::kBlackHole:
      return !Has(plan, kHasNoLimit);
    case Fault::kBadCertificate:
      return plan.tls && UsesCurl(plan);
    case Fault::kNoise:
    case Fault::kGarbage:
    case Fault::kCutHead:
    case Fault::kUnauthorized:
    case Fault::kServerError:
    case Fault::kLongLength:
    case Fault::kShortLength:
      return !lines;
    case Fault::kBadChunk:
      return Has(plan, kDecodesChunks);
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
  if (plan.fault == Fault::kLongLength || plan.fault == Fault::kShortLength || Has(plan, kSoap)) {
    return Framing::kLength;
  }
  const auto framing = static_cast<Framing>(Below(3, random));
  return framing == Framing::kChunked && !Has(plan, kDecodesChunks) ? Framing::kClose : framing;
}

// Mostly small, now and then longer than the library's buffers, rarely over the mebibyte up to
// which a SOAP response is read at once.
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

const std::vector<SoakOperation>& SoakOperations() {
  static const std::vector<SoakOperation> operations = {
      {"SendRequestByGet, ReadBody", "get_body", kDecodesChunks | kSendsQuery},
      {"the same, one object", "get_body", kOneObject},
      {"SendRequestByGet, ReadData", "get_data"},
      {"SendRequest(GET), login", "login_get", kDecodesChunks | kLogsIn},
      {"SendRequestBySocketPost", "form_post", kDecodesChunks | kSendsCookie, Sends::kForm},
      {"SendReqBySocketPost", "soap", kSoap, Sends::kEnvelope},
      {"SendAuthReqBySocketPost", "soap_login", kSoap | kLogsIn, Sends::kEnvelope},
      {"SendReqByXMLSocketPost", "soap_xml", kSoap | kXml, Sends::kEnvelope},
      {"OpenRawDataUpload, GetResp", "upload", kDecodesChunks, Sends::kUpload},
      {"second request, GetResp", "second_request", kDecodesChunks | kTwoRequests},
      {"TWSocket, SSLSocket", "socket_exchange", kLine},
      {"SendHttpGet", "json_get", kJson | kSendsQuery},
      {"SendHttpPost", "json_post", kDecodesChunks | kReadsNothing, Sends::kForm},
      {"SendRequestByCurl(GET)", "curl_get", kDecodesChunks},
      {"SendRequestByCurl(POST)", "curl_post", kDecodesChunks | kSendsCookie, Sends::kPath},
      {"SendRequestByCurl, file", "curl_get_file", kDecodesChunks},
      {"SendRequest(POST), login", "curl_login_form",
       kDecodesChunks | kLogsIn | kHasNoLimit | kReadsNothing, Sends::kForm},
      {"SendReqByXMLGet", "xml_get", kDecodesChunks | kXml | kLogsIn},
      {"SendReqByXMLPost", "xml_post", kDecodesChunks | kXml | kHasNoLimit, Sends::kIndentedPreset},
      {"SendReqByXMLPut", "xml_put", kDecodesChunks | kXml | kHasNoLimit, Sends::kPreset},
      {"SendReqByXMLDelete", "xml_delete", kDecodesChunks | kXml | kHasNoLimit},
      {"SendHttpsGet", "json_get_tls", kDecodesChunks | kJson},
      {"settings: one key", nullptr},
      {"settings: levels", nullptr},
      {"TW_LOG, TWPrintf", nullptr},
      {"UrlEncode and the like", nullptr},
      {"CreateThread", nullptr},
      {"WriteFd, DelayTimer", nullptr},
  };
  return operations;
}

std::string MissedOperations() {
  // Parts of what the others do, and other ways to read the same responses.
  const std::vector<std::string> left_out = {
      "get_lines",   "get_twice",    "get_head_again", "curl_post_file", "curl_form",
      "curl_handle", "connect",      "reconnect",      "keep_alive",     "probe",
      "socket_data", "socket_lines", "socket_raw"};
  std::vector<std::string> names;
  for (const SoakOperation& operation : SoakOperations()) {
    if (operation.name != nullptr) names.emplace_back(operation.name);
  }
  return Unmatched(names, left_out);
}

const char* NameOf(Fault fault) {
  return kFaultNames[static_cast<int>(fault)];
}

const SoakOperation& OperationOf(const Plan& plan) {
  return SoakOperations()[static_cast<size_t>(plan.operation)];
}

bool Has(const Plan& plan, Trait trait) {
  return (OperationOf(plan).traits & trait) != 0;
}

bool UsesServer(const Plan& plan) {
  return OperationOf(plan).name != nullptr;
}

bool UsesCurl(const Plan& plan) {
  return UsesServer(plan) && OperationNamed(OperationOf(plan).name).curl;
}

size_t Below(size_t limit, Random* random) {
  return (*random)() % limit;
}

Plan NextPlan(unsigned id, Random* random) {
  Plan plan;
  plan.id = id;
  plan.operation = static_cast<int>(Below(SoakOperations().size(), random));
  plan.size = 1 + Below(3000, random);
  if (!UsesServer(plan)) return plan;
  const OverTls tls = OperationNamed(OperationOf(plan).name).tls;
  plan.tls = tls == OverTls::kAlways || (tls == OverTls::kEither && Below(2, random) == 0);
  const size_t chance = Below(100, random);
  if (chance < 5) plan.fault = PickFault(plan, random);
  if (chance == 5) plan.fault = Fault::kSlow;
  plan.framing = PickFraming(plan, random);
  plan.size = plan.fault == Fault::kSlow ? 1 + Below(400, random) : PickSize(random);
  if (Has(plan, kLogsIn)) plan.scheme = static_cast<Scheme>(Below(4, random));
  return plan;
}

std::string ToPath(const Plan& plan) {
  char text[128];
  snprintf(text, sizeof(text), "soak/%d/%d/%u/%zu/%d/%d/", plan.operation,
           static_cast<int>(plan.fault), plan.id, plan.size, static_cast<int>(plan.framing),
           static_cast<int>(plan.scheme));
  return text;
}

bool FindPlan(const std::string& request, Plan* plan) {
  const size_t found = request.find("soak/");
  if (found == std::string::npos) return false;
  int operation = 0;
  int fault = 0;
  int framing = 0;
  int scheme = 0;
  if (sscanf(request.c_str() + found, "soak/%d/%d/%u/%zu/%d/%d/", &operation, &fault, &plan->id,
             &plan->size, &framing, &scheme) != 6) {
    return false;
  }
  const int count = static_cast<int>(SoakOperations().size());
  if (operation < 0 || operation >= count) return false;
  plan->operation = operation;
  plan->fault = static_cast<Fault>(fault);
  plan->framing = static_cast<Framing>(framing);
  plan->scheme = static_cast<Scheme>(scheme);
  return true;
}

std::string ValueOf(const Plan& plan) {
  return Filler(plan, true);
}

std::string ResponseBodyOf(const Plan& plan) {
  if (Has(plan, kXml)) return "<response><value>" + ValueOf(plan) + "</value></response>";
  if (Has(plan, kJson)) return "{\"success\":true,\"value\":\"" + ValueOf(plan) + "\"}";
  if (Has(plan, kLine)) return ValueOf(plan);
  return Filler(plan, false);
}

std::string RequestBodyOf(const Plan& plan) {
  const std::string id = std::to_string(plan.id);
  switch (OperationOf(plan).sends) {
    case Sends::kEnvelope:
      return "<Envelope><Body><Get id=\"" + id + "\"/></Body></Envelope>";
    case Sends::kForm:
      return "id=" + id + "&value=" + ValueOf(plan).substr(0, 2000);
    case Sends::kIndentedPreset:
      return "<?xml version=\"1.0\"?>\n<preset>\n  <pan>" + id + "</pan>\n</preset>\n";
    case Sends::kPreset:
      return "<?xml version=\"1.0\"?>\n<preset><pan>" + id + "</pan></preset>\n";
    case Sends::kPath:
      return ToPath(plan);
    case Sends::kUpload:
      return std::string("--") + kBoundary +
             "\r\nContent-Disposition: form-data; name=\"clip\"\r\n\r\n" + ValueOf(plan) +
             "\r\n--" + kBoundary + "--\r\n";
    case Sends::kNothing:
      break;
  }
  return "";
}
