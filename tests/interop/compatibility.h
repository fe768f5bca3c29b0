// What the table of compatibility gains from a test: which operation was used with which server.
//
//   Worked("SendRequestByGet", "Apache httpd", "Basic", mode);
//
// When TARNWICK_COMPATIBILITY_FILE names a file, the program writes it, a line a row: operation,
// server, login, transport, reading and result, with tabs between them. A row of a test that failed
// gets the failure as its result.
#ifndef TARNWICK_TESTS_INTEROP_COMPATIBILITY_H_
#define TARNWICK_TESTS_INTEROP_COMPATIBILITY_H_

#include <ostream>
#include <string>

// How a client reaches the server and reads from it.
struct Mode {
  bool tls = false;
  bool buffered = true;
};

inline constexpr Mode kModes[] = {{false, true}, {false, false}, {true, true}, {true, false}};
inline constexpr Mode kPlainModes[] = {{false, true}, {false, false}};

std::string NameOf(const Mode& mode);
std::ostream& operator<<(std::ostream& out, const Mode& mode);

// One row. `transport`: "plain", "TLS", "TLS 1.2" ...; `reading`: "buffered", "direct" or, where
// libcurl reads, "libcurl".
struct Row {
  std::string operation, server, login, transport, reading, result;
};

// Adds a row to the running test.
void AddRow(const Row& row);

// Adds a row for an operation over the client's socket.
void Worked(const std::string& operation, const std::string& server, const std::string& login,
            const Mode& mode);

// Adds a row for an operation through libcurl.
void WorkedByCurl(const std::string& operation, const std::string& server, const std::string& login,
                  bool tls);

#endif  // TARNWICK_TESTS_INTEROP_COMPATIBILITY_H_
