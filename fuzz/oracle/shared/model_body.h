// How a body is read, told once more in the plainest way.
#ifndef TARNWICK_FUZZ_ORACLE_SHARED_MODEL_BODY_H_
#define TARNWICK_FUZZ_ORACLE_SHARED_MODEL_BODY_H_

#include <string>

#include "fuzz/oracle/shared/model_socket.h"

// Results: HTTP_RET_OK or HTTP_RET_IO_ERROR; `body` is what came in both cases.
int ReadModelBody(ModelSocket* socket, const std::string& encoding, std::string* body);

#endif  // TARNWICK_FUZZ_ORACLE_SHARED_MODEL_BODY_H_
