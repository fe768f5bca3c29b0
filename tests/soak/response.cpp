#include "tests/soak/response.h"

#include <algorithm>
#include <cstdio>
#include <string_view>

#include "tests/soak/credentials.h"

namespace {

constexpr char kSecondMark[] = "/second";

bool Contains(const std::string& text, std::string_view part) {
  return text.find(part) != std::string::npos;
}

// The parts of a response on their way to the client.
struct Response {
  std::string head;
  std::string body;  // as it travels, with its framing
  bool keep_open = false;
};

std::string Chunked(const Plan& plan, const std::string& body) {
  Random random(plan.id);
  std::string text;
  for (size_t sent = 0; sent < body.size();) {
    // The second chunk of a bad one has no size; the first never is the whole body.
    const size_t most = plan.fault == Fault::kBadChunk ? body.size() / 2 : body.size() - sent;
    const size_t count = most == 0 ? 0 : std::min(most, 1 + Below(20000, &random));
    char size[32];
    snprintf(size, sizeof(size), "%zx\r\n", count);
    if (count > 0) text += size + body.substr(sent, count) + "\r\n";
    if (plan.fault == Fault::kBadChunk) return text + "zz\r\n";
    sent += count;
  }
  return text + "0\r\n\r\n";
}

size_t AnnouncedLength(const Plan& plan, size_t length) {
  if (plan.fault == Fault::kLongLength) return length + 1 + plan.id % 5000;
  if (plan.fault == Fault::kShortLength) return length - 1 - plan.id % length;
  return length;
}

Response Success(const Plan& plan, bool keep_open) {
  Response response;
  response.keep_open = keep_open;
  const std::string body = ResponseBodyOf(plan);
  const std::string id = std::to_string(plan.id);
  response.head = "HTTP/1.1 200 OK\r\nContent-Type: text/x-soak; id=" + id +
                  "\r\nSet-Cookie: id=" + id + "; Path=/\r\n";
  if (!keep_open) response.head += "Connection: close\r\n";
  if (plan.framing == Framing::kLength) {
    response.head +=
        "Content-Length: " + std::to_string(AnnouncedLength(plan, body.size())) + "\r\n";
  }
  if (plan.framing == Framing::kChunked) response.head += "Transfer-Encoding: chunked\r\n";
  response.head += "\r\n";
  response.body = plan.framing == Framing::kChunked ? Chunked(plan, body) : body;
  return response;
}

Response Refusal(const std::string& status, const std::string& more, unsigned id) {
  // A refusal without a body is another path through the SOAP requests than one with a body.
  const std::string body = id % 2 == 0 ? "refused" : "";
  return {"HTTP/1.1 " + status + "\r\n" + more +
              "Connection: close\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n",
          body, false};
}

// What the request holds that its plan does not: empty for a right one.
std::string WrongPart(const Request& request) {
  const Plan& plan = request.plan;
  if (request.body != RequestBodyOf(plan)) return "body";
  if (Has(plan, kSendsQuery) && !Contains(request.head, std::string(kEncodedQuery) + " HTTP/"))
    return "query";
  if (Has(plan, kSendsCookie) &&
      !Contains(request.head, "Cookie: id=" + std::to_string(plan.id) + "\r\n")) {
    return "cookie";
  }
  return "";
}

Response ResponseTo(const Request& request) {
  const Plan& plan = request.plan;
  if (Has(plan, kLine)) return {"", ResponseBodyOf(plan) + "\r\n", false};
  if (plan.fault == Fault::kServerError) return Refusal("500 Soak", "", plan.id);
  // Asked for in turns where the plan names none.
  const Scheme scheme = plan.scheme != Scheme::kNone         ? plan.scheme
                        : plan.fault != Fault::kUnauthorized ? Scheme::kNone
                        : plan.id % 4 < 2                    ? Scheme::kBasic
                                                             : Scheme::kDigest;
  if (plan.fault == Fault::kUnauthorized || !CredentialsAreRight(scheme, request.head)) {
    return Refusal("401 Unauthorized", ChallengeOf(scheme), plan.id);
  }
  const std::string wrong = WrongPart(request);
  if (!wrong.empty()) return Refusal("409 Wrong " + wrong, "", plan.id);
  const bool first = Has(plan, kTwoRequests) && !Contains(request.head, kSecondMark);
  if (!first) return Success(plan, false);
  Plan healthy = plan;
  healthy.fault = Fault::kNone;
  healthy.framing = Framing::kLength;
  return Success(healthy, true);
}

void WriteSlowly(ServerConnection* connection, const std::string& bytes, unsigned seed) {
  Random random(seed);
  for (size_t sent = 0; sent < bytes.size();) {
    const size_t count = 1 + Below(20, &random);
    if (!connection->Write(bytes.substr(sent, count))) return;
    sent += count;
  }
}

// The part of `bytes` that a cut lets through: never more than half of them.
std::string Half(const std::string& bytes, unsigned seed) {
  return bytes.substr(0, seed % (bytes.size() / 2 + 1));
}

}  // namespace

bool ReadRequest(ServerConnection* connection, Request* request) {
  if (!connection->ReadRequest(&request->head, &request->body)) return false;
  if (!Contains(request->head, "multipart/form-data")) {
    return FindPlan(request->head, &request->plan) || FindPlan(request->body, &request->plan);
  }
  if (!FindPlan(request->head, &request->plan)) return false;
  // In the middle of what the client writes.
  if (request->plan.fault == Fault::kReset) return true;
  return connection->ReadUntil(std::string(kBoundary) + "--\r\n", &request->body);
}

bool SendResponse(ServerConnection* connection, const Request& request) {
  const Plan& plan = request.plan;
  const Response response = ResponseTo(request);
  if (response.keep_open) return connection->Write(response.head + response.body);
  switch (plan.fault) {
    case Fault::kReset:
      connection->Reset();
      return false;
    case Fault::kStall:
      connection->Stall();
      return false;
    case Fault::kGarbage:
      connection->Write(Noise(plan.id));
      break;
    case Fault::kCutHead:
      connection->Write(response.head.substr(0, plan.id % (response.head.size() - 2)));
      connection->Cut();
      return false;
    case Fault::kCutBody:
      connection->Write(response.head + Half(response.body, plan.id));
      connection->Cut();
      return false;
    case Fault::kResetBody:
      connection->Write(response.head + Half(response.body, plan.id));
      connection->Reset();
      return false;
    case Fault::kStallBody:
      connection->Write(response.head + Half(response.body, plan.id));
      connection->Stall();
      return false;
    case Fault::kSlow:
      WriteSlowly(connection, response.head + response.body, plan.id);
      break;
    default:
      connection->Write(response.head + response.body);
  }
  connection->Close();
  return false;
}

std::string Noise(unsigned seed) {
  Random random(seed);
  std::string bytes(1 + Below(5000, &random), '\0');
  for (char& c : bytes) c = static_cast<char>(Below(256, &random));
  bytes[0] = '\x01';  // neither a status line nor a TLS record
  return bytes;
}
