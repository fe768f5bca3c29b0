#include "tests/interop/web_server.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <poll.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>

#include "tests/interop/certificates.h"
#include "tests/support/ports.h"

namespace {

using std::chrono::seconds;
using std::chrono::steady_clock;

void ReplaceAll(std::string* text, const std::string& from, const std::string& to) {
  for (size_t at = 0; (at = text->find(from, at)) != std::string::npos; at += to.size()) {
    text->replace(at, from.size(), to);
  }
}

std::string WithValues(std::string text, const std::map<std::string, std::string>& values) {
  for (const auto& [name, value] : values) ReplaceAll(&text, "@" + name + "@", value);
  return text;
}

bool Accepts(int port) {
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  const bool accepted = connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0;
  close(fd);
  return accepted;
}

[[noreturn]] void Execute(const std::vector<std::string>& command, const std::string& output,
                          int input) {
  std::vector<char*> argv;
  for (const std::string& word : command) argv.push_back(const_cast<char*>(word.c_str()));
  argv.push_back(nullptr);
  setpgid(0, 0);  // Apache httpd ends its process group with itself
  const int out = open(output.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0644);
  dup2(out, STDOUT_FILENO);
  dup2(out, STDERR_FILENO);
  dup2(input >= 0 ? input : open("/dev/null", O_RDONLY), STDIN_FILENO);
  execv(argv[0], argv.data());
  _exit(127);
}

std::vector<std::string> AsPlainUser(const std::vector<std::string>& command) {
  std::vector<std::string> words = {"/usr/bin/unshare", "--user", "--map-user=33",
                                    "--map-group=33",   "--",     "/usr/bin/setpriv",
                                    "--pdeathsig",      "TERM",   "--"};
  words.insert(words.end(), command.begin(), command.end());
  return words;
}

}  // namespace

bool WaitUntilTrue(const char* what, const std::function<bool()>& done, int limit) {
  const auto deadline = steady_clock::now() + seconds(limit);
  while (!done()) {
    if (steady_clock::now() > deadline) {
      ADD_FAILURE() << "waited in vain until " << what;
      return false;
    }
    poll(nullptr, 0, 5);
  }
  return true;
}

ServerProgram::ServerProgram(const std::vector<std::string>& command, const std::string& output,
                             int input) {
  const std::vector<std::string> words = AsPlainUser(command);
  child_ = std::make_unique<Child>([&]() -> int { Execute(words, output, input); });
}

ServerProgram::~ServerProgram() {
  if (!child_) return;
  kill(child_->Pid(), SIGTERM);
  child_->Wait(seconds(10));
}

void ServerProgram::Kill() {
  kill(child_->Pid(), SIGKILL);
  child_->Wait(seconds(10));
  child_.reset();
}

WebServer::WebServer(const WebServerSetup& setup) : name_(setup.name) {
  mkdir(File("www").c_str(), 0755);
  WriteFile(File("good.pem"), ReadFile(Certificates().File("good")));
  WriteFile(File("ca.pem"), ReadFile(Certificates().CaFile()));
  const std::vector<std::string> command = FillTemplates(setup);
  process_ = std::make_unique<ServerProgram>(command, File("output.log"));
  for (const auto& [port_name, port] : ports_) {
    const int number = port;
    const std::string what = name_ + " accepts on " + port_name;
    if (WaitUntilTrue(what.c_str(), [number] { return Accepts(number); })) continue;
    ADD_FAILURE() << ReadFile(File("output.log")) << ReadFile(File("error.log"));
    return;
  }
}

int WebServer::Port(const std::string& name) const {
  const auto found = ports_.find(name);
  return found != ports_.end() ? found->second : -1;
}

std::vector<std::string> WebServer::FillTemplates(const WebServerSetup& setup) {
  std::map<std::string, std::string> values = setup.values;
  values["ROOT"] = directory_.Path();
  values["FOLDER"] = TARNWICK_INTEROP_FOLDER;
  std::vector<int> taken;  // all at once, so that no port is given twice
  for (const std::string& port : setup.ports) {
    taken.push_back(BindLoopback(&ports_[port]));
    values[port] = std::to_string(ports_[port]);
  }
  for (const std::string& file : setup.templates) {
    const std::string text = ReadFile(std::string(TARNWICK_INTEROP_FOLDER "/servers/") + file);
    WriteFile(File(file), WithValues(text, values));
  }
  if (!setup.templates.empty()) values["CONFIG"] = File(setup.templates.front());
  std::vector<std::string> command;
  for (const std::string& word : setup.command) command.push_back(WithValues(word, values));
  for (const int fd : taken) close(fd);
  return command;
}
