// A client that posts SOAP envelopes, told once more in the plainest way.
#ifndef TARNWICK_FUZZ_ORACLE_SOAP_RESPONSE_H_
#define TARNWICK_FUZZ_ORACLE_SOAP_RESPONSE_H_

#include <string>

#include "fuzz/oracle/shared/model_credentials.h"
#include "fuzz/oracle/shared/model_head.h"
#include "fuzz/oracle/shared/model_socket.h"

namespace oracle {

class SoapClient {
 public:
  // `time` is what time(2) shows the library. REQUIRES: `socket` outlives the object.
  SoapClient(ModelSocket* socket, std::string host, ModelCredentials credentials, long time);

  // Results: the client's result codes; `response` changes only when there is one.
  int Post(const std::string& envelope, std::string* response);
  int PostWithCredentials(const std::string& envelope, std::string* response);

  const ModelHead& Head() const { return head_; }
  int Result() const { return result_; }

 private:
  std::string RequestFor(const std::string& envelope);

  ModelSocket* socket_;
  std::string host_;
  ModelCredentials credentials_;
  long time_;
  ModelHead head_;
  int result_ = 1;
  std::string authorization_;
};

// The length that a header field announces: its leading decimal number; 0 when no response can be that long.
int AnnouncedLength(const std::string& value);

// What of a response is parsed as XML.
std::string WithoutLineEnds(const std::string& text);

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_SOAP_RESPONSE_H_
