// From a request to the response.
#include "tools/twcamsim/session.h"

namespace {

bool WantsContinue(const Request& request) {
  return EqualsIgnoringCase(request.Get("Expect"), "100-continue");
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
      return Refuse(*request, 400, "Bad request: " + request->deviation + "\n");
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
  const Steps steps = RenderResponse(response, request);
  NoteResponse(request, steps);
  return Play(steps) && CloseNow();
}

bool Session::BeforeResponse() {
  switch (behaviour_.after_request) {
    case AfterRequest::kAnswer:
      return true;
    case AfterRequest::kClose:
      return CloseNow();
    case AfterRequest::kReset:
      return ResetNow();
    case AfterRequest::kStall:
      return StallUntilPeerLeaves();
  }
  return false;
}

AuthenticationStyle Session::StyleFor(const Request& request) {
  const std::string own = endpoint_->profile->LoginFor(request);
  AuthenticationStyle style =
      *FindAuthenticationStyle(own.empty() ? endpoint_->authentication_style : own);
  for (const Fault& fault : endpoint_->faults) {
    if (!fault.type->hooks.authentication) continue;
    fault.type->hooks.authentication(&style, {fault.arguments, &request, &random_});
    NoteFault(fault);
  }
  return style;
}

Response Session::MakeResponseTo(const Request& request, const AuthenticationStyle& style,
                                 const Verdict& verdict) {
  if (!verdict.passed) return Refuse(style, verdict);
  Response response = style.forbid
                          ? MakeResponse(403, "text/plain", "These credentials may not do that.\n")
                          : Ask(request, verdict);
  if (response.raw) return response;
  for (const Fault& fault : endpoint_->faults) {
    if (!fault.type->hooks.response) continue;
    fault.type->hooks.response(&response, {fault.arguments, &request, &random_});
    NoteFault(fault);
  }
  return response;
}

Response Session::Refuse(const AuthenticationStyle& style, const Verdict& verdict) {
  Response response = MakeResponse(
      401, "text/plain", "Credentials refused: " + verdict.field + ": " + verdict.text + "\n");
  for (const std::string& challenge :
       endpoint_->authenticator.Challenges(style, verdict, &random_)) {
    response.headers.push_back({"WWW-Authenticate", challenge});
  }
  return response;
}

Response Session::Ask(const Request& request, const Verdict& verdict) {
  BodySource source = [this](std::string* bytes) { return reader_.ReadStream(bytes) == Io::kDone; };
  const bool streams = endpoint_->profile->TakesStream(request);
  if (streams && WantsContinue(request)) Send("HTTP/1.1 100 Continue\r\n\r\n");
  const std::string user = verdict.scheme == "none" ? "" : verdict.user;
  return endpoint_->profile->Respond({request, user, &random_, streams ? &source : nullptr});
}

Steps Session::Render(const Response& response, const Request& request) {
  Steps steps = RenderResponse(response, request);
  if (response.raw) return steps;
  for (const Fault& fault : endpoint_->faults) {
    if (!fault.type->hooks.steps) continue;
    fault.type->hooks.steps(&steps, {fault.arguments, &request, &random_});
    NoteFault(fault);
  }
  return steps;
}
