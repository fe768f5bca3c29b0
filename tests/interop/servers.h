// The servers of the tests, and clients for them.
#ifndef TARNWICK_TESTS_INTEROP_SERVERS_H_
#define TARNWICK_TESTS_INTEROP_SERVERS_H_

#include <memory>
#include <string>

#include "tests/http/http_test_util.h"
#include "tests/interop/compatibility.h"
#include "tests/interop/web_server.h"

// Each starts on the first call and ends with the program.
WebServer& Apache();
WebServer& Nginx();
WebServer& Lighttpd();
WebServer& Gsoap();
WebServer& Microhttpd();
WebServer& Poco();
WebServer& Node();
WebServer& Caddy();    // asks Node.js
WebServer& Haproxy();  // the same
WebServer& Stunnel();  // the same
WebServer& Busybox();
#ifdef TARNWICK_TWCAMSIM
WebServer& SimulatedCamera();
#endif

inline constexpr char kUser[] = "operator";
inline constexpr char kPassword[] = "gate-7";

// The size of nginx's large file, "large".
inline constexpr size_t kLargeFile = 64u << 20;

// The settings of a client for `path`, with the operator's login.
ClientSettings LoginTo(const Mode& mode, const std::string& path);

// A client for the server's port of that mode: PORT, or TLS_PORT.
std::unique_ptr<ExposedClient> NewClient(const WebServer& server, const ClientSettings& settings);

// As ReadBody of the client, which must succeed.
std::string BodyOf(TWHttpClient* client);

// The status of the last response, 0 without one.
int StatusOf(TWHttpClient* client);

#endif  // TARNWICK_TESTS_INTEROP_SERVERS_H_
