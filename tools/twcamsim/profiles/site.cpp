// A whole camera: information, commands, services and an upload, without credentials, below /basic
// with Basic and below /digest with Digest.
#include <fcntl.h>
#include <fmt/format.h>

#include <mutex>

#include "tools/common/private_file.h"
#include "tools/twcamsim/echo.h"
#include "tools/twcamsim/profile.h"
#include "tools/twcamsim/upload_counter.h"

namespace {

constexpr char kInfo[] = "{\"camera\":\"north gate\",\"success\":true}\n";

bool StartsWith(const std::string& text, const std::string& start) {
  return text.compare(0, start.size(), start) == 0;
}

// The path below the directory that stands for a style of authentication.
std::string Below(const std::string& path) {
  for (const char* directory : {"/basic", "/digest"}) {
    if (StartsWith(path, std::string(directory) + "/"))
      return path.substr(std::string(directory).size());
  }
  return path;
}

class Site : public Profile {
 public:
  explicit Site(std::string posted) : posted_(std::move(posted)) {}

  bool TakesStream(const Request& request) const override {
    return request.method == "POST" && Below(request.path) == "/count.cgi";
  }

  std::string LoginFor(const Request& request) const override {
    if (StartsWith(request.path, "/basic/")) return "basic";
    if (StartsWith(request.path, "/digest/")) return "digest";
    return "";
  }

  Response Respond(const Exchange& exchange) override {
    const std::string path = Below(exchange.request.path);
    if (path == "/info.json") return MakeResponse(200, "application/json", kInfo);
    if (path == "/json.cgi" || path == "/") return EchoAsJson(exchange);
    if (path == "/text.cgi") return EchoAsText(exchange);
    if (path == "/xml.cgi") return EchoAsXml(exchange);
    if (path == "/count.cgi") return Count(exchange);
    if (path == "/command.sh") return Command(exchange.request);
    return MakeResponse(404, "text/plain", "not found\n");
  }

 private:
  static Response Count(const Exchange& exchange) {
    if (!exchange.source) return MakeResponse(405, "text/plain", "POST a clip\n");
    const UploadCount count = CountUpload(exchange.request, 0, *exchange.source);
    return MakeResponse(200, "text/plain", fmt::format("{} {}\n", count.bytes, count.end));
  }

  Response Command(const Request& request) {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (!posted_.empty()) Keep(request.body);
    return MakeResponse(200, "text/plain", "ok\n");
  }

  // It may hold a password. What cannot be written is missed by whoever looks for it.
  void Keep(const std::string& body) const {
    std::string error;
    const tarnwick::UniqueFd fd = OpenOwnFile(posted_, O_WRONLY | O_TRUNC, 0600, &error);
    if (fd.Valid()) (void)WriteAll(fd, body);
  }

  const std::string posted_;
  std::mutex mutex_;
};

std::unique_ptr<Profile> MakeSite(const ProfileOptions& options, std::string* error) {
  const auto found = options.find("posted");
  const std::string posted = found == options.end() ? "" : found->second;
  if (!posted.empty() && !OpenOwnFile(posted, O_WRONLY | O_TRUNC, 0600, error).Valid()) {
    *error = posted + " cannot be written (" + *error + ")";
    return nullptr;
  }
  return std::make_unique<Site>(posted);
}

}  // namespace

ProfileType SiteProfile() {
  return {"site",
          "none",
          "a whole camera: /info.json, /json.cgi, /text.cgi, /xml.cgi, /count.cgi and /command.sh; "
          "the same below /basic and /digest with credentials",
          {{"posted", "FILE", "keeps the form last posted to command.sh there"}},
          MakeSite};
}
