// twcamsim: simulated cameras, and all that can be wrong with one.
#include <json/value.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <filesystem>
#include <random>
#include <set>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/twcamsim/arguments.h"
#include "tools/twcamsim/lists.h"
#include "tools/twcamsim/server.h"

namespace {

constexpr int kFailed = 1;
constexpr int kUsage = 2;

int Complain(int status, const std::string& text) {
  PrintError("twcamsim", text);
  return status;
}

// The directory for the authority's certificate: one that stays, or one that goes away with this
// object.
class Directory {
 public:
  Directory() = default;
  ~Directory() {
    std::error_code ignored;
    if (temporary_) std::filesystem::remove_all(path_, ignored);
  }
  Directory(const Directory&) = delete;
  Directory& operator=(const Directory&) = delete;

  bool Make(const std::string& wish, std::string* error) {
    path_ = wish;
    std::error_code code;
    if (wish.empty()) {
      path_ = std::filesystem::temp_directory_path(code).string();
      if (code) path_ = "the directory for temporary files (TMPDIR)";
      if (!code) MakeTemporary(&code);
    } else {
      std::filesystem::create_directories(wish, code);
    }
    if (code) *error = path_ + ": " + code.message();
    return !code;
  }

  const std::string& Path() const { return path_; }

 private:
  void MakeTemporary(std::error_code* code) {
    path_ += "/twcamsim.XXXXXX";
    temporary_ = mkdtemp(path_.data()) != nullptr;
    if (!temporary_) *code = std::error_code(errno, std::generic_category());
  }

  std::string path_;
  bool temporary_ = false;
};

std::set<std::string> TlsHosts(const std::vector<std::unique_ptr<Endpoint>>& endpoints) {
  std::set<std::string> hosts;
  for (const auto& endpoint : endpoints) {
    if (endpoint->tls) hosts.insert(endpoint->host);
  }
  return hosts;
}

bool PrepareSharedState(const Arguments& arguments, SharedState* shared, std::string* error) {
  shared->seed = arguments.seed ? *arguments.seed : std::random_device()();
  shared->idle = arguments.idle;
  shared->hold = arguments.hold;
  return shared->journal.Open(arguments.journal, error) &&
         shared->access.Open(arguments.access, error);
}

// A simulated camera takes what it gets, from whoever reaches it, and its passwords stand in its
// manual page.
void WarnOfNetwork(const std::vector<std::unique_ptr<Endpoint>>& endpoints) {
  for (const auto& endpoint : endpoints) {
    if (endpoint->host.compare(0, 4, "127.") == 0) continue;
    Complain(0, "WARNING: " + endpoint->name + " listens at " + endpoint->host +
                    ", not on the loopback interface alone: whoever reaches this machine can use"
                    " it, and it is made to misbehave");
  }
}

int Serve(const Arguments& arguments, std::vector<std::unique_ptr<Endpoint>> endpoints) {
  SharedState shared;
  Directory directory;
  std::string error;
  if (!PrepareSharedState(arguments, &shared, &error)) return Complain(kFailed, error);
  Json::Value report(Json::objectValue);
  report["seed"] = static_cast<Json::UInt64>(shared.seed);
  report["pid"] = getpid();
  const std::set<std::string> hosts = TlsHosts(endpoints);
  WarnOfNetwork(endpoints);
  if (!hosts.empty()) {
    if (!directory.Make(arguments.dir, &error) || !shared.certificates.Make(hosts, &error) ||
        !shared.certificates.WriteAuthority(directory.Path() + "/ca.pem", &error)) {
      return Complain(kFailed, error);
    }
    report["ca"] = directory.Path() + "/ca.pem";
  }
  Server server(&shared, std::move(endpoints));
  if (!server.Listen(&error)) return Complain(kFailed, error);
  report["endpoints"] = server.Describe();
  if (!PrintJsonLine(report)) return Complain(kFailed, "standard output is gone");
  server.Run(arguments.run_for);
  return 0;
}

}  // namespace

int main(int argc, char** argv) try {
  Arguments arguments;
  if (const std::optional<int> status = ParseArguments(argc, argv, &arguments)) return *status;
  if (arguments.list_faults) return ListFaults(arguments.json) ? 0 : kFailed;
  if (arguments.list_profiles) return ListProfiles(arguments.json) ? 0 : kFailed;
  if (arguments.list_logins) return ListLogins(arguments.json) ? 0 : kFailed;
  std::vector<std::unique_ptr<Endpoint>> endpoints;
  std::string error;
  if (!MakeEndpoints(arguments, &endpoints, &error)) return Complain(kUsage, error);
  return Serve(arguments, std::move(endpoints));
} catch (const std::exception& error) {  // memory ran out, or the like
  return Complain(kFailed, error.what());
}
