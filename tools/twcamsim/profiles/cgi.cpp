// A camera's CGI programs, which respond with lines of text; without credentials, with Basic, with
// Digest.
#include "tools/twcamsim/echo.h"
#include "tools/twcamsim/profile.h"

namespace {

class CgiService : public Profile {
 public:
  Response Respond(const Exchange& exchange) override {
    const std::string& path = exchange.request.path;
    if (path == "/info.cgi") {
      return MakeResponse(200, "text/plain", "camera=north gate\nmodel=TW-1\npresets=4\n");
    }
    if (path == "/set.cgi") return MakeResponse(200, "text/plain", "ok\n");
    if (path == "/text.cgi") return EchoAsText(exchange);
    if (path == "/cookie.cgi") {
      Response response = EchoAsText(exchange);
      response.Set("Set-Cookie", "session=42; Path=/; HttpOnly");
      return response;
    }
    return MakeResponse(404, "text/plain", "no such program\n");
  }
};

std::unique_ptr<Profile> MakeCgi(const ProfileOptions& /*options*/, std::string* /*error*/) {
  return std::make_unique<CgiService>();
}

}  // namespace

std::vector<ProfileType> CgiProfiles() {
  return {
      {"cgi",
       "none",
       "a camera's programs: /info.cgi, /set.cgi, /text.cgi tells what came, /cookie.cgi also sets "
       "a cookie",
       {},
       MakeCgi},
      {"cgi-basic", "basic", "the same with Basic authentication", {}, MakeCgi},
      {"cgi-digest", "digest", "the same with Digest authentication", {}, MakeCgi},
  };
}
