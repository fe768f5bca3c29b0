// What the cases are made of.
#include <chrono>
#include <thread>

#include "tests/longest_call/cases.h"

namespace {

std::vector<std::string> g_operations;  // that cases run

// The first failure of the operation's steps, or what its last read returned. Through libcurl there
// is no response to look at.
int ResultOf(const PeerOperation& operation, const OperationResult& result) {
  if (result.result != HTTP_RET_OK) return result.result;
  const bool failed = !operation.curl && result.response != HTTP_RET_OK;
  return failed ? result.response : result.read;
}

Step Pause(double seconds) {
  return {"Pause()",
          [seconds](PeerConnection&, std::string*) {
            std::this_thread::sleep_for(std::chrono::duration<double>(seconds));
            return true;
          },
          false};
}

}  // namespace

std::function<int(int port)> Operation(const char* name, const Change& change) {
  g_operations.emplace_back(name);
  OperationSettings settings;
  settings.path = "info.json";  // at the camera's profile json; the scripts do not look
  settings.user = "operator";   // the camera's own account
  settings.password = "gate-7";
  settings.version = HTTP_VERSION_1_1;
  settings.timeout = settings.limit = kTimeout;
  settings.body = "GET /info.json HTTP/1.0\r\n\r\n";
  if (change) change(settings);
  const PeerOperation& operation = OperationNamed(name);
  return [settings, &operation](int port) mutable {
    settings.port = port;
    return ResultOf(operation, operation.run(settings));
  };
}

std::string MissedOperations() {
  // They wait as those that the cases run, one after the other, or do not wait.
  return Unmatched(g_operations,
                   {"get_data", "get_lines", "get_twice", "get_head_again", "second_request",
                    "curl_get_file", "curl_post", "curl_post_file", "curl_login_form",
                    "curl_handle", "reconnect", "keep_alive", "socket_raw"});
}

Script Drip(const std::string& bytes, double pause) {
  Script script;
  for (const char byte : bytes) {
    script.push_back(Pause(pause));
    script.push_back(Send(std::string(1, byte)));
  }
  script.push_back(StallUntilFinish());
  return script;
}
