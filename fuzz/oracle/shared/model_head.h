// How the head of a response is read, told once more in the plainest way.
#ifndef TARNWICK_FUZZ_ORACLE_SHARED_MODEL_HEAD_H_
#define TARNWICK_FUZZ_ORACLE_SHARED_MODEL_HEAD_H_

#include <map>
#include <string>
#include <vector>

#include "fuzz/oracle/shared/model_socket.h"

// A header field that a client keeps: its name in lower case, and its HTTP_MAP_KEY or -1.
struct ModelField {
  std::string name;
  int key;
};

// The oracle's own list; LLVMFuzzerInitialize of response_head compares it with the library's.
const std::vector<ModelField>& ModelFields();

// What a client keeps of a response. `encoding` outlives a response that has none.
struct ModelHead {
  int state = 1;  // 2: the head has been read
  int status = 0;
  std::map<int, std::string> kept;  // by HTTP_MAP_KEY
  std::string cookie;
  std::string challenge;
  std::string encoding;
};

// Reads status line and header lines. Results: the client's result codes.
int ReadModelHead(ModelSocket* socket, ModelHead* head);

#endif  // TARNWICK_FUZZ_ORACLE_SHARED_MODEL_HEAD_H_
