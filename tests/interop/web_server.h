// A server that runs as a process of its own while the object lives.
#ifndef TARNWICK_TESTS_INTEROP_WEB_SERVER_H_
#define TARNWICK_TESTS_INTEROP_WEB_SERVER_H_

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "tests/support/files.h"
#include "tests/support/process.h"

// Calls `done` until it is true; false, with a failed test, when that takes longer than `seconds`.
bool WaitUntilTrue(const char* what, const std::function<bool()>& done, int seconds = 10);

class ServerProgram {
 public:
  // Starts `command`, whose output goes into the file `output` and whose standard input is `input`,
  // or nothing for -1. It ends with the test program, whatever happens to that.
  //
  // For the server it looks as if a plain user ran it: the servers of the tests would otherwise
  // change to users that a user namespace does not have.
  ServerProgram(const std::vector<std::string>& command, const std::string& output, int input = -1);

  // Asks it to end, and ends it when it does not.
  ~ServerProgram();

  ServerProgram(const ServerProgram&) = delete;
  ServerProgram& operator=(const ServerProgram&) = delete;

  // Ends it at once, without a chance to say goodbye to its clients.
  void Kill();

 private:
  std::unique_ptr<Child> child_;
};

// Where a web server comes from.
struct WebServerSetup {
  std::string name;                           // as the table of results shows it
  std::vector<std::string> command;           // @CONFIG@ stands for the configuration file
  std::vector<std::string> templates;         // files of servers/; the first is the configuration
  std::vector<std::string> ports;             // the names of its ports in command and templates
  std::map<std::string, std::string> values;  // further names of command and templates
};

// A web server, configured from templates in servers/, with a directory of its own. It accepts
// connections on all its ports when the constructor returns.
class WebServer {
 public:
  explicit WebServer(const WebServerSetup& setup);

  const std::string& Name() const { return name_; }
  int Port(const std::string& name = "PORT") const;

  // The path of `name` in the server's directory; "www/" in there is its document root.
  std::string File(const std::string& name) const { return directory_.File(name); }

 private:
  std::vector<std::string> FillTemplates(const WebServerSetup& setup);

  std::string name_;
  TempDir directory_;
  std::map<std::string, int> ports_;
  std::unique_ptr<ServerProgram> process_;
};

#endif  // TARNWICK_TESTS_INTEROP_WEB_SERVER_H_
