// A client over its own socket, written once more in the plainest way: what it sends on each
// connection, and what it makes of the responses.
#ifndef TARNWICK_FUZZ_ORACLE_EXCHANGE_H_
#define TARNWICK_FUZZ_ORACLE_EXCHANGE_H_

#include <string>
#include <vector>

#include "fuzz/oracle/shared/model_credentials.h"
#include "fuzz/oracle/shared/model_head.h"
#include "fuzz/oracle/shared/model_socket.h"
#include "fuzz/support/script.h"

struct ModelSettings {
  std::string host;
  int port = 0;
  int timeout = 0;
  bool buffered = false;
  bool encode = false;
  bool basic = false;
  int version = 0;  // 2: HTTP/1.1, 1: HTTP/1.0, 0: none chosen
  std::string keep;
  ModelCredentials credentials;
};

class ModelClient {
 public:
  ModelClient(ModelSettings settings, const std::vector<Connection>& connections,
              const std::vector<size_t>& sizes);

  int Get();
  int GetWithCredentials();
  int Form(const std::string& content);
  int Soap(const std::string& body, std::string* response);
  int SoapWithCredentials(const std::string& body, std::string* response);
  int OpenUpload();
  int WriteData(const std::string& data);
  int ReadBody(std::string* body);
  std::string GetResp();

  void SetCookie(const std::string& cookie) { head_.cookie = cookie; }
  int Result() const { return result_; }
  const ModelHead& Head() const { return head_; }
  const ModelSocket& Socket() const { return socket_; }

 private:
  void ReadHead();
  bool MakeCredentials(const std::string& method);
  std::string AuthorizationLine();
  std::string GetRequest();
  std::string CookieLine() const;

  ModelSettings settings_;
  ModelSocket socket_;
  ModelHead head_;
  int result_ = 1;
  std::string authorization_;
};

#endif  // TARNWICK_FUZZ_ORACLE_EXCHANGE_H_
