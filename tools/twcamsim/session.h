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
struct World {
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
  Session(World* world, Endpoint* endpoint, int fd, int number);

  void Run();
  void Stop() { link_.Stop(); }
  bool IsFinished() const { return finished_; }

 private:
  // The opening; false when the connection is over.
  bool Open();
  bool OpenTls();
  bool Shake();
  void OpenWithBytes(const std::string& bytes, bool reset);

  // One request and its answer; false when the connection is over.
  bool ServeOne();
  bool TakeRequest(Request* request);
  bool Refuse(const Request& request, int status, const std::string& text);
  bool BeforeAnswer();
  Response MakeAnswer(const Request& request, const LoginStyle& style, const Verdict& verdict);
  Response Refuse(const LoginStyle& style, const Verdict& verdict);
  Response Ask(const Request& request, const Verdict& verdict);
  LoginStyle StyleFor(const Request& request);
  Wire Render(const Response& response, const Request& request);

  // The way out.
  bool Play(const Wire& wire);
  bool PlayStep(const WireStep& step);
  bool PlayMore(const Response& response);
  bool Send(const std::string& bytes);
  bool SendPaced(const std::string& bytes);

  // Every end of a connection goes through one of these; both return false.
  bool End(const char* how);
  bool End(Io result);
  bool CloseNow();
  bool ResetNow();
  bool Hold();

  // The journal.
  void NoteRequest(const Request& request, const Verdict& verdict);
  void NoteAnswer(const Request& request, const Wire& wire);
  void NoteFault(const Fault& fault) { faults_.insert(fault.text); }
  void WriteRecord();

  World* world_;
  Endpoint* endpoint_;
  Link link_;
  Random random_;
  Behaviour behaviour_;
  RequestReader reader_;
  std::atomic<bool> finished_{false};

  int64_t sent_ = 0;  // of the behaviour's output limit
  std::chrono::steady_clock::time_point start_;
  std::string end_;
  std::set<std::string> faults_;
  size_t noted_ = 0;    // bytes of requests in the record
  size_t unnoted_ = 0;  // requests behind those
  Json::Value record_;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_SESSION_H_
