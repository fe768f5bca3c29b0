// What the operations of the HTTP client have in common.
#ifndef TARNWICK_TESTS_TORTURE_HTTP_OPERATIONS_H_
#define TARNWICK_TESTS_TORTURE_HTTP_OPERATIONS_H_

#include <json/value.h>
#include <libxml/tree.h>

#include <memory>
#include <string>
#include <utility>

#include "tests/http/http_test_util.h"
#include "tests/torture/stage.h"

using Client = std::unique_ptr<ClientProbe>;

// A client with a login for the stage's peer.
inline ClientSettings At(const std::string& path) {
  ClientSettings settings;
  settings.path = path;
  settings.version = HTTP_VERSION_1_1;
  settings.user = "user";
  settings.password = "password";
  settings.timeout = 2;
  return settings;
}

inline Client NewClient(const Stage& stage, const ClientSettings& settings) {
  return std::make_unique<ClientProbe>(stage.Port(), settings);
}

// The client's end is a step of the library's as well.
inline void Destroy(Stage& stage, Client client) {
  stage.Run([&] { client.reset(); });
}

inline void ExpectResult(Stage& stage, int result) {
  stage.ExpectEither(result == HTTP_RET_OK, result == HTTP_RET_IO_ERROR, "the result is wrong");
}

// A document that is freed at the end.
class Document {
 public:
  Document() = default;
  explicit Document(const char* text);
  ~Document() { xmlFreeDoc(doc_); }
  Document(const Document&) = delete;
  Document& operator=(const Document&) = delete;

  xmlDoc*& Get() { return doc_; }

  // It is the peer's, whole.
  bool IsBody() const;

 private:
  xmlDoc* doc_ = nullptr;
};

// The value is the peer's JSON, whole.
bool IsJsonBody(const Json::Value& value);

#endif  // TARNWICK_TESTS_TORTURE_HTTP_OPERATIONS_H_
