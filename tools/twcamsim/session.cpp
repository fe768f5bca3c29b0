#include "tools/twcamsim/session.h"

#include "tools/common/json_output.h"

namespace {

// Of one connection in the journal.
constexpr size_t kMostNoted = size_t{4} << 20;

const char* EndName(Io result) {
  switch (result) {
    case Io::kEnd:
      return "peer-closed";
    case Io::kReset:
      return "peer-reset";
    case Io::kTimeout:
      return "timeout";
    case Io::kStopped:
      return "stopped";
    default:
      return "error";
  }
}

Json::Value AuthenticationRecord(const Verdict& verdict) {
  Json::Value record(Json::objectValue);
  record["passed"] = verdict.passed;
  record["scheme"] = verdict.scheme;
  if (!verdict.user.empty()) record["user"] = verdict.user;
  if (verdict.passed) return record;
  record["field"] = verdict.field;
  record["text"] = verdict.text;
  return record;
}

// The code of a response as it went out, which a fault may have made anything.
std::string StatusOf(const Steps& steps) {
  const std::string bytes = BytesOf(steps).substr(0, 64);
  const size_t blank = bytes.find(' ');
  if (blank == std::string::npos) return "";
  return bytes.substr(blank + 1, bytes.find_first_of(" \r\n", blank + 1) - blank - 1);
}

}  // namespace

Behaviour BehaviourOf(const std::vector<Fault>& faults, Random* random) {
  Behaviour behaviour;
  for (const Fault& fault : faults) {
    if (!fault.type->hooks.behaviour) continue;
    fault.type->hooks.behaviour(&behaviour, {fault.arguments, nullptr, random});
  }
  return behaviour;
}

Session::Session(SharedState* shared, Endpoint* endpoint, int fd, int number)
    : shared_(shared),
      endpoint_(endpoint),
      connection_(fd),
      random_(shared->seed, static_cast<uint64_t>(endpoint->index), static_cast<uint64_t>(number)),
      behaviour_(BehaviourOf(endpoint->faults, &random_)),
      reader_(&connection_, behaviour_, shared->idle, &shared->budget),
      start_(std::chrono::steady_clock::now()),
      record_(Json::objectValue) {
  record_["time"] = TimeText();
  record_["endpoint"] = endpoint->name;
  record_["connection"] = number;
  record_["peer"] = connection_.Peer();
  record_["requests"] = Json::Value(Json::arrayValue);
  for (const Fault& fault : endpoint->faults) {
    if (fault.type->hooks.behaviour && (endpoint->tls || !fault.type->needs_tls)) NoteFault(fault);
  }
}

void Session::Run() {
  try {
    if (Open()) {
      while (ServeOne()) {
      }
    }
  } catch (const std::exception& exception) {  // no memory for what a fault or a client asks for
    record_["error"] = exception.what();
    connection_.Reset();
    End("error");
  }
  WriteRecord();
  finished_ = true;
}

bool Session::ServeOne() {
  Request request;
  if (!TakeRequest(&request)) return false;
  const AuthenticationStyle style = StyleFor(request);
  const Verdict verdict = endpoint_->authenticator.Check(style, request);
  NoteRequest(request, verdict);
  if (!BeforeResponse()) return false;
  Response response = MakeResponseTo(request, style, verdict);
  const bool streams = endpoint_->profile->TakesStream(request);
  if (!request.KeepsAlive() || streams || response.more) response.close = true;
  const Steps steps = Render(response, request);
  NoteResponse(request, steps);
  if (!Play(steps) || (response.more && !PlayMore(response))) return false;
  return response.close && !response.raw ? CloseNow() : true;
}

bool Session::End(const char* how) {
  if (end_.empty()) end_ = how;
  return false;
}

bool Session::End(Io result) {
  End(EndName(result));
  connection_.Close(behaviour_.close_notice);
  return false;
}

bool Session::CloseNow() {
  connection_.Close(behaviour_.close_notice);
  return End("closed");
}

bool Session::ResetNow() {
  connection_.Reset();
  return End("reset");
}

bool Session::StallUntilPeerLeaves() {
  return End(connection_.WaitUntilPeerLeaves(shared_->hold));
}

// A client that keeps its connection may send requests for days, and the record is written at the
// end.
void Session::NoteRequest(const Request& request, const Verdict& verdict) {
  if (!shared_->journal.IsOpen()) return;
  if (noted_ > kMostNoted) {
    ++unnoted_;
    return;
  }
  Json::Value entry(Json::objectValue);
  entry["method"] = request.method;
  entry["target"] = request.target;
  entry["head"] = Excerpt(request.head);
  entry["body"] = Excerpt(request.body);
  entry["body_bytes"] = static_cast<Json::UInt64>(request.body.size());
  if (!request.deviation.empty()) entry["sloppy"] = request.deviation;
  if (!verdict.scheme.empty()) entry["login"] = AuthenticationRecord(verdict);
  record_["requests"].append(entry);
  constexpr size_t kOverhead = 1024;
  noted_ += kOverhead + entry["head"].asString().size() + entry["body"].asString().size();
}

void Session::NoteResponse(const Request& request, const Steps& steps) {
  const std::string status = StatusOf(steps);
  Json::Value& requests = record_["requests"];
  if (!requests.empty() && unnoted_ == 0) requests[requests.size() - 1]["status"] = status;
  const auto word = [](const std::string& text) { return text.empty() ? "-" : text; };
  shared_->access.Write(word(request.method) + " " + word(request.path) + " " + word(status));
}

void Session::WriteRecord() {
  record_["tls"] = connection_.TlsVersion();
  Json::Value& faults = record_["faults"] = Json::Value(Json::arrayValue);
  for (const std::string& fault : faults_) faults.append(fault);
  if (unnoted_ > 0) record_["more_requests"] = static_cast<Json::UInt64>(unnoted_);
  record_["bytes_in"] = static_cast<Json::UInt64>(connection_.BytesIn());
  record_["bytes_out"] = static_cast<Json::UInt64>(connection_.BytesOut());
  const auto span = std::chrono::steady_clock::now() - start_;
  record_["duration_ms"] =
      static_cast<Json::Int64>(std::chrono::duration_cast<std::chrono::milliseconds>(span).count());
  record_["end"] = end_;
  if (!connection_.ErrorText().empty()) record_["error"] = connection_.ErrorText();
  shared_->journal.Write(CompactJson(record_));
}
