#include "tests/soak/operations.h"

#include <libxml/tree.h>

#include <algorithm>

Outcome RunOperation(const Plan& plan, Session* session) {
  if (!UsesServer(plan.operation)) return RunLocalOperation(plan, session);
  if (UsesCurl(plan.operation)) return RunCurlOperation(plan, *session);
  return RunSocketOperation(plan, session);
}

int PortOf(const Plan& plan, const Endpoints& endpoints) {
  switch (plan.fault) {
    case Fault::kRefused:
      return endpoints.refused;
    case Fault::kBlackHole:
      return endpoints.black_hole;
    case Fault::kHangUp:
      return endpoints.server.hang_up;
    case Fault::kNoise:
      return endpoints.server.noise;
    case Fault::kSilence:
      return endpoints.server.silence;
    case Fault::kBadCertificate:
      return endpoints.server.bad_certificate;
    default:
      return plan.tls ? endpoints.server.tls : endpoints.server.plain;
  }
}

int TimeoutOf(const Plan& plan) {
  constexpr int kGenerous = 30;
  const bool waits = plan.fault == Fault::kBlackHole || plan.fault == Fault::kSilence ||
                     plan.fault == Fault::kStall || plan.fault == Fault::kStallBody;
  return waits ? 1 : kGenerous;
}

std::unique_ptr<TWHttpClient> NewClient(const Plan& plan, const Session& session,
                                        const std::string& path) {
  const char* const host = plan.id % 8 == 0 ? "localhost" : "127.0.0.1";
  // Without a buffer a SOAP request takes what one read gives for the reply.
  const bool buffered = plan.size > 4000 || plan.id % 8 != 1 || IsSoap(plan.operation);
  const bool encode = plan.operation == Operation::kGet;
  const bool basic_at_once = plan.login == Login::kBasic && plan.id % 2 == 0;
  const auto version = static_cast<HTTP_VERSION>(plan.id % 3);
  return std::make_unique<TWHttpClient>(host, PortOf(plan, session.endpoints), path, kUser,
                                        kPassword, TimeoutOf(plan), plan.tls, buffered, encode,
                                        basic_at_once, version, "");
}

Outcome Compare(const std::string& got, const std::string& wanted) {
  if (got == wanted) return {Outcome::kRight, ""};
  if (wanted.compare(0, got.size(), got) == 0) return {Outcome::kCut, ""};
  const auto differ = std::mismatch(got.begin(), got.end(), wanted.begin(), wanted.end());
  return Wrong(std::to_string(got.size()) + " bytes where " + std::to_string(wanted.size()) +
               " were due, different from byte " + std::to_string(differ.first - got.begin()));
}

Outcome FailedWith(int result, std::initializer_list<int> documented) {
  if (std::find(documented.begin(), documented.end(), result) != documented.end()) {
    return {Outcome::kFailed, "with result " + std::to_string(result)};
  }
  return Wrong("result " + std::to_string(result));
}

Outcome Wrong(const std::string& detail) {
  return {Outcome::kWrong, detail};
}

Outcome CompareXml(const Plan& plan, xmlDoc* doc) {
  xmlChar* const text = xmlNodeGetContent(reinterpret_cast<const xmlNode*>(doc));
  const std::string value = text != nullptr ? reinterpret_cast<const char*>(text) : "";
  xmlFree(text);
  xmlFreeDoc(doc);
  return value == ValueOf(plan) ? Outcome() : Wrong("another document");
}
