// A device that is steered by SOAP envelopes.
#include <fmt/format.h>

#include "tools/twcamsim/profile.h"
#include "tools/twcamsim/xml_text.h"

namespace {

constexpr char kType[] = "application/soap+xml; charset=utf-8";
constexpr int kPresets = 4;

std::string Envelope(const std::string& body) {
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
         "<s:Envelope xmlns:s=\"http://www.w3.org/2003/05/soap-envelope\">\n<s:Body>" +
         body + "</s:Body>\n</s:Envelope>\n";
}

// SOAP sends every fault with 500.
Response Fault(const std::string& code, const std::string& reason) {
  return MakeResponse(500, kType,
                      Envelope(fmt::format("<s:Fault><s:Code><s:Value>s:{}</s:Value></s:Code>"
                                           "<s:Reason><s:Text xml:lang=\"en\">{}</s:Text>"
                                           "</s:Reason></s:Fault>",
                                           code, EscapeXml(reason))));
}

Response Done(const std::string& body) {
  return MakeResponse(200, kType, Envelope(body));
}

Response ListPresets() {
  std::string body = "<GetPresetsResponse>";
  for (int i = 1; i <= kPresets; ++i) {
    body += fmt::format("\n  <Preset token=\"{0}\"><Name>position {0}</Name></Preset>", i);
  }
  return Done(body + "\n</GetPresetsResponse>");
}

Response GoTo(const std::string& text) {
  for (int i = 1; i <= kPresets; ++i) {
    if (text.find(std::to_string(i)) != std::string::npos) return Done("<GotoPresetResponse/>");
  }
  return Fault("Sender", "There is no preset \"" + text + "\".");
}

class SoapDevice : public Profile {
 public:
  Response Respond(const Exchange& exchange) override {
    const Request& request = exchange.request;
    if (request.method != "POST") return MakeResponse(405, "text/plain", "POST an envelope\n");
    if (request.body.empty()) return Fault("Sender", "The body is empty.");
    const XmlRequest asked = ParseXmlRequest(request.body);
    if (!asked.well_formed) return Fault("Sender", "The envelope is not well-formed XML.");
    const std::string command = asked.command.empty() ? asked.root : asked.command;
    if (command == "GetDeviceInformation") {
      return Done(
          "<GetDeviceInformationResponse><Model>TW-1</Model><Name>north gate</Name>"
          "</GetDeviceInformationResponse>");
    }
    if (command == "GetPresets") return ListPresets();
    if (command == "GotoPreset") return GoTo(asked.text);
    return Fault("Sender", "There is no operation \"" + command + "\".");
  }
};

}  // namespace

ProfileType SoapProfile() {
  return {
      "soap",
      "none",
      "a SOAP device at any path: GetDeviceInformation, GetPresets, GotoPreset; a fault document "
      "with 500 for all else, an empty body included",
      {},
      [](const ProfileOptions&, std::string*) -> std::unique_ptr<Profile> {
        return std::make_unique<SoapDevice>();
      }};
}
