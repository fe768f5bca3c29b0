// What the tests of bodies share.
#ifndef TARNWICK_TESTS_HTTP_BODY_TEST_UTIL_H_
#define TARNWICK_TESTS_HTTP_BODY_TEST_UTIL_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/http/http_test_util.h"
#include "tests/support/tls_scripted_peer.h"

inline constexpr char kErrorText[] = "{\"error\":true}";
inline constexpr char kWikipedia[] = "4\r\nWiki\r\n5\r\npedia\r\n0\r\n\r\n";

inline std::string Plain(const std::string& body) {
  return "HTTP/1.1 200 OK\r\n\r\n" + body;
}

inline std::string Chunked(const std::string& chunks) {
  return "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n" + chunks;
}

struct Transport {
  bool tls;
  bool buffered;
};

inline constexpr Transport kTransports[] = {
    {false, false}, {false, true}, {true, false}, {true, true}};

inline void ForEachTransport(const std::function<void(const Transport&)>& test) {
  for (const Transport& transport : kTransports) {
    SCOPED_TRACE(std::string(transport.tls ? "TLS, " : "plain, ") +
                 (transport.buffered ? "buffered" : "direct"));
    test(transport);
  }
}

inline std::unique_ptr<ScriptedPeer> NewPeer(const Transport& transport,
                                             std::vector<Script> scripts) {
  if (transport.tls) return std::make_unique<TlsScriptedPeer>(std::move(scripts));
  return std::make_unique<ScriptedPeer>(std::move(scripts));
}

inline ClientSettings SettingsOf(const Transport& transport) {
  ClientSettings settings;
  settings.https = transport.tls;
  settings.buffered = transport.buffered;
  return settings;
}

#endif  // TARNWICK_TESTS_HTTP_BODY_TEST_UTIL_H_
