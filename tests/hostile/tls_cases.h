// What the tables of TLS servers share.
#ifndef TARNWICK_TESTS_HOSTILE_TLS_CASES_H_
#define TARNWICK_TESTS_HOSTILE_TLS_CASES_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <string>
#include <vector>

#include "tests/hostile/hostile_util.h"
#include "tests/hostile/server_tls.h"

inline SharedTls Tls12() {
  return std::make_shared<ServerTls>(TLS1_2_VERSION);
}
inline SharedTls Tls13() {
  return std::make_shared<ServerTls>(TLS1_3_VERSION);
}
inline SharedTls TlsOf(int version) {
  return std::make_shared<ServerTls>(version);
}

inline Script Concat(Script script, const Script& more) {
  script.insert(script.end(), more.begin(), more.end());
  return script;
}

// Ends the stream and waits for the client's end, so that nothing arrives on a closed connection.
inline Script EndOfStream() {
  return {ShutdownWrite(), DiscardUntilEnd()};
}

// The lines of the TLS socket, without OpenSSL's text.
inline std::vector<std::string> TlsLines(const LogCapture& log) {
  std::vector<std::string> lines;
  for (const LogLine& line : log.Lines("socket")) {
    if (line.source != "sslsocket") continue;
    const size_t text = line.message.find("] [");
    const std::string message =
        text == std::string::npos ? line.message : line.message.substr(0, text + 1);
    lines.push_back(line.level + " " + line.function + ": " + message);
  }
  return lines;
}

inline constexpr int kProtocol = SSL_ERROR_SSL;
inline constexpr int kEnd = SSL_ERROR_ZERO_RETURN;
inline constexpr int kSystem = SSL_ERROR_SYSCALL;
inline constexpr int kNoError = SSL_ERROR_NONE;

inline std::string HandshakeMessage(int type, size_t announced, const std::string& content) {
  return {std::string({static_cast<char>(type), static_cast<char>(announced >> 16),
                       static_cast<char>(announced >> 8), static_cast<char>(announced)}) +
          content};
}

inline std::string Data(ServerTls& tls, const std::string& bytes) {
  return tls.Encrypted(kDataRecord, bytes);
}

// Records have numbers: a list makes them in its order.
inline std::string InOrder(std::initializer_list<std::string> records) {
  std::string all;
  for (const std::string& record : records) all += record;
  return all;
}

inline std::string EmptyRecords(ServerTls& tls, int count) {
  std::string records;
  for (int i = 0; i < count; ++i) records += Data(tls, "");
  return records;
}

inline std::string Alerts(ServerTls& tls, int count, const std::string& alert) {
  std::string records;
  for (int i = 0; i < count; ++i) records += tls.Encrypted(kAlertRecord, alert);
  return records;
}

template <typename Case>
inline std::string NameOf(const ::testing::TestParamInfo<Case>& info) {
  return info.param.name;
}

#endif  // TARNWICK_TESTS_HOSTILE_TLS_CASES_H_
