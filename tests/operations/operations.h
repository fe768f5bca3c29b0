// Every operation of the HTTP client and of the sockets that talks with a peer: one table, in which
// each is entered once. Programs and tests that go through all operations run them from here; what
// such a program needs beside it, it keys by the operation's name and checks with Unmatched().
#ifndef TARNWICK_TESTS_OPERATIONS_OPERATIONS_H_
#define TARNWICK_TESTS_OPERATIONS_OPERATIONS_H_

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "tests/http/http_test_util.h"

// The peer, the client's settings, and what is sent.
struct OperationSettings : ClientSettings {
  int port = 0;
  int limit = 5;             // seconds, of a transfer through libcurl and of HasDataToRead
  bool verify = true;        // libcurl verifies the certificate
  unsigned int address = 0;  // of the host, in network order; 0: it is resolved
  std::string cookie = {};   // "name=value"
  std::string body = {};     // of a POST, PUT or upload; all that a socket writes
  std::string second = {};   // a request that follows on the same connection
  size_t piece = 512;        // bytes of the caller's buffer
  size_t most = 8 << 20;     // no more reads after so many bytes
  bool read_body = true;     // not the head alone
  bool go_on = false;        // goes on after a step that has failed
  std::shared_ptr<ExposedClient> client = {};  // is used again, with another path

  // Runs one step of the library's, when it is set: the steps are all that a fault may strike.
  std::function<void(const std::function<void()>&)> run_step = {};

  template <typename Function>
  void Step(Function function) const {
    if (run_step) {
      run_step(std::ref(function));
    } else {
      function();
    }
  }
};

// What an operation came to.
struct OperationResult {
  int result = 0;              // of the call that the operation is named after
  int response = HTTP_RET_OK;  // of CheckResponse, and its status; -1 where there is none to ask
  int status = -1;
  bool head = false;                           // a whole head was read
  std::map<HTTP_MAP_KEY, std::string> fields;  // that the client keeps of the head
  std::string cookie;
  std::string encoding;

  int read = 0;            // of the last ReadBody, ReadData or ReadToLineEnd
  bool has_text = false;   // `text` is all that there is to read
  bool untouched = false;  // a failure has left the caller's output as it was
  std::string text;        // the body, the document or the value
  std::string first;       // what came before: a line, another body, a document as it was received
  bool healthy = true;     // the smaller calls beside it have succeeded as well
  std::string mistake;     // what no contract allows; empty when there is nothing

  // Empty when the head had none.
  std::string Field(HTTP_MAP_KEY key) const {
    const auto found = fields.find(key);
    return found == fields.end() ? "" : found->second;
  }
};

enum class OverTls { kNever, kEither, kAlways };

struct PeerOperation {
  const char* name;
  OperationResult (*run)(const OperationSettings& settings);
  std::vector<int> failures;  // the documented results beside 0
  OverTls tls = OverTls::kEither;
  bool curl = false;  // through libcurl
};

const std::vector<PeerOperation>& PeerOperations();

// The one of this name; ends the process when there is none.
const PeerOperation& OperationNamed(const std::string& name);

// The operations that a program neither lists nor leaves out, and the names that the table does not
// have, each with a blank in front; empty when all is well.
std::string Unmatched(const std::vector<std::string>& listed,
                      const std::vector<std::string>& left_out);

#endif  // TARNWICK_TESTS_OPERATIONS_OPERATIONS_H_
