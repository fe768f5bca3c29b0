// A JSON service, as the one-call helpers talk to it: "success" in each response, by the path.
#include <json/value.h>

#include "tools/common/json_output.h"
#include "tools/twcamsim/echo.h"
#include "tools/twcamsim/profile.h"

namespace {

Json::Value Success(bool success) {
  Json::Value value(Json::objectValue);
  value["success"] = success;
  return value;
}

Json::Value Info() {
  Json::Value value = Success(true);
  value["camera"] = "north gate";
  value["model"] = "TW-1";
  value["presets"] = 4;
  return value;
}

Json::Value Refusal(int code) {
  Json::Value value = Success(false);
  value["error"]["code"] = code;
  return value;
}

Response JsonResponse(int status, const Json::Value& value) {
  return MakeResponse(status, "application/json", CompactJson(value));
}

class JsonService : public Profile {
 public:
  Response Respond(const Exchange& exchange) override {
    const std::string& path = exchange.request.path;
    if (path == "/info.json") return JsonResponse(200, Info());
    if (path == "/echo.json" || path == "/") return EchoAsJson(exchange);
    if (path == "/refused.json") return JsonResponse(200, Refusal(105));
    if (path == "/missing.json") return MakeResponse(200, "application/json", R"({"data":1})");
    if (path == "/text.json") {
      return MakeResponse(200, "application/json", R"({"success":"yes"})");
    }
    if (path == "/login.json") {
      Response response = JsonResponse(200, Success(true));
      response.Set("Set-Cookie", "session=" + exchange.random->Hex(8) + "; Path=/");
      return response;
    }
    return JsonResponse(404, Refusal(404));
  }
};

}  // namespace

ProfileType JsonProfile() {
  return {"json",
          "none",
          "a JSON service: /info.json, /echo.json and /login.json with \"success\":true, "
          "/refused.json with false, /missing.json without it, /text.json with a text",
          {},
          [](const ProfileOptions&, std::string*) -> std::unique_ptr<Profile> {
            return std::make_unique<JsonService>();
          }};
}
