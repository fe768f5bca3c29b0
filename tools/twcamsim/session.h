// One connection from its acceptance to its line in the journal.
#ifndef TARNWICK_TOOLS_TWCAMSIM_SESSION_H_
#define TARNWICK_TOOLS_TWCAMSIM_SESSION_H_

#include <json/value.h>

#include <atomic>
#include <chrono>
#include <set>
#include <string>

#include "tools/twcamsim/behaviour.h"
#include "tools/twcamsim/certificates.h"
#include "tools/twcamsim/connection.h"
#include "tools/twcamsim/endpoint.h"
#include "tools/twcamsim/journal.h"
#include "tools/twcamsim/random.h"
#include "tools/twcamsim/request_reader.h"

// What all connections share.
struct SharedState {
  uint64_t seed = 0;
  std::chrono::milliseconds idle{0};  // a connection without a byte for that long is closed
  std::chrono::milliseconds hold{0};  // a stall for good lasts that long at most
  Certificates certificates;
  Journal journal;
  Journal access;
  MemoryBudget budget;
};

// What the faults of an endpoint make of a connection.
Behaviour BehaviourOf(const std::vector<Fault>& faults, Random* random);

// Threads: Run on one; Stop and IsFinished on any.
class Session {
 public:
  // Owns `fd`. `number` counts the endpoint's connections from 1.
  Session(SharedState* shared, Endpoint* endpoint, int fd, int number);

  void Run();
  void Stop() { connection_.Stop(); }
  bool IsFinished() const { return finished_; }

 private:
  // The opening; false when the connection is over.
  bool Open();
  bool OpenTls();
  bool Shake();
  void OpenWithBytes(const std::string& bytes, bool reset);

  // One request and its response; false when the connection is over.
  bool ServeOne();
  bool TakeRequest(Request* request);
  bool Refuse(const Request& request, int status, const std::string& text);
  bool BeforeResponse();
  Response MakeResponseTo(const Request& request, const AuthenticationStyle& style,
                          const Verdict& verdict);
  Response Refuse(const AuthenticationStyle& style, const Verdict& verdict);
  Response Ask(const Request& request, const Verdict& verdict);
  AuthenticationStyle StyleFor(const Request& request);
  Steps Render(const Response& response, const Request& request);

  // The way out.
  bool Play(const Steps& steps);
  bool PlayStep(const Step& step);
  bool PlayMore(const Response& response);
  bool Send(const std::string& bytes);
  bool SendPaced(const std::string& bytes);

  // Every end of a connection goes through one of these; both return false.
  bool End(const char* how);
  bool End(Io result);
  bool CloseNow();
  bool ResetNow();
  bool StallUntilPeerLeaves();

  // The journal.
  void NoteRequest(const Request& request, const Verdict& verdict);
  void NoteResponse(const Request& request, const Steps& steps);
  void NoteFault(const Fault& fault) { faults_.insert(fault.text); }
  void WriteRecord();

  SharedState* shared_;
  Endpoint* endpoint_;
  Connection connection_;
  Random random_;
  Behaviour behaviour_;
  RequestReader reader_;
  std::atomic<bool> finished_{false};

  int64_t sent_ = 0;  // of the behaviour's output limit
  std::chrono::steady_clock::time_point start_;
  std::string end_;
  std::set<std::string> faults_;
  size_t noted_ = 0;    // bytes of requests in the record
  size_t unnoted_ = 0;  // requests after those
  Json::Value record_;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_SESSION_H_
