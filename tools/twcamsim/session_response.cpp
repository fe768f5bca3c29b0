// From a request to the answer.
#include "tools/twcamsim/session.h"

namespace {

bool WantsContinue(const Request& request) {
  return SameName(request.Get("Expect"), "100-continue");
}

}  // namespace

bool Session::TakeRequest(Request* request) {
  Reading reading = reader_.ReadHead(request);
  if (reading == Reading::kDone && !endpoint_->profile->TakesStream(*request)) {
    if (WantsContinue(*request) && !Send("HTTP/1.1 100 Continue\r\n\r\n")) return false;
    reading = reader_.ReadBody(request);
  }
  if (reading == Reading::kDone) return true;
  if (!request->head.empty()) NoteRequest(*request, Verdict());
  switch (reading) {
    case Reading::kBad:
      return Refuse(*request, 400, "Bad request: " + request->sloppy + "\n");
    case Reading::kFull:
      return Refuse(*request, 503, "All connections together hold 80 MiB of requests\n");
    case Reading::kLimit:
      return CloseNow();
    default:
      return End(reader_.Result());
  }
}

bool Session::Refuse(const Request& request, int status, const std::string& text) {
  Response response = MakeResponse(status, "text/plain", text);
  response.close = true;
  const Wire wire = RenderResponse(response, request);
  NoteAnswer(request, wire);
  return Play(wire) && CloseNow();
}

bool Session::BeforeAnswer() {
  switch (behaviour_.after_request) {
    case AfterRequest::kAnswer:
      return true;
    case AfterRequest::kClose:
      return CloseNow();
    case AfterRequest::kReset:
      return ResetNow();
    case AfterRequest::kStall:
      return Hold();
  }
  return false;
}

LoginStyle Session::StyleFor(const Request& request) {
  const std::string own = endpoint_->profile->LoginFor(request);
  LoginStyle style = *FindLoginStyle(own.empty() ? endpoint_->login_style : own);
  for (const Fault& fault : endpoint_->faults) {
    if (!fault.type->hooks.login) continue;
    fault.type->hooks.login(&style, {fault.arguments, &request, &random_});
    NoteFault(fault);
  }
  return style;
}

Response Session::MakeAnswer(const Request& request, const LoginStyle& style,
                             const Verdict& verdict) {
  if (!verdict.passed) return Refuse(style, verdict);
  Response response = style.forbid
                          ? MakeResponse(403, "text/plain", "This login may not do that.\n")
                          : Ask(request, verdict);
  if (response.raw) return response;
  for (const Fault& fault : endpoint_->faults) {
    if (!fault.type->hooks.response) continue;
    fault.type->hooks.response(&response, {fault.arguments, &request, &random_});
    NoteFault(fault);
  }
  return response;
}

Response Session::Refuse(const LoginStyle& style, const Verdict& verdict) {
  Response response = MakeResponse(401, "text/plain",
                                   "Login refused: " + verdict.field + ": " + verdict.text + "\n");
  for (const std::string& challenge : endpoint_->login.Challenges(style, verdict, &random_)) {
    response.headers.push_back({"WWW-Authenticate", challenge});
  }
  return response;
}

Response Session::Ask(const Request& request, const Verdict& verdict) {
  BodySource source = [this](std::string* bytes) { return reader_.ReadStream(bytes) == Io::kDone; };
  const bool streams = endpoint_->profile->TakesStream(request);
  if (streams && WantsContinue(request)) Send("HTTP/1.1 100 Continue\r\n\r\n");
  const std::string user = verdict.scheme == "none" ? "" : verdict.user;
  return endpoint_->profile->Answer({request, user, &random_, streams ? &source : nullptr});
}

Wire Session::Render(const Response& response, const Request& request) {
  Wire wire = RenderResponse(response, request);
  if (response.raw) return wire;
  for (const Fault& fault : endpoint_->faults) {
    if (!fault.type->hooks.wire) continue;
    fault.type->hooks.wire(&wire, {fault.arguments, &request, &random_});
    NoteFault(fault);
  }
  return wire;
}
