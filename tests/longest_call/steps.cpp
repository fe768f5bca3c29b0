#include <chrono>
#include <thread>

#include "tests/longest_call/cases.h"

namespace {

Step Pause(double seconds) {
  return {"Pause()",
          [seconds](PeerConnection&, std::string*) {
            std::this_thread::sleep_for(std::chrono::duration<double>(seconds));
            return true;
          },
          false};
}

}  // namespace

Script Drip(const std::string& bytes, double pause) {
  Script script;
  for (const char byte : bytes) {
    script.push_back(Pause(pause));
    script.push_back(Send(std::string(1, byte)));
  }
  script.push_back(StallUntilFinish());
  return script;
}
