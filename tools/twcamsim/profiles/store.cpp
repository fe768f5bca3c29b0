// A REST device that keeps XML documents: GET, POST, PUT and DELETE below /presets. What it keeps
// is gone with the program.
#include <fmt/format.h>

#include <map>
#include <mutex>

#include "tools/twcamsim/profile.h"
#include "tools/twcamsim/xml_text.h"

namespace {

constexpr char kType[] = "application/xml; charset=UTF-8";
constexpr char kDirectory[] = "/presets";
constexpr size_t kMostDocuments = 10000;

Response Document(int status, const std::string& text) {
  return MakeResponse(status, kType, text);
}

Response Problem(int status, const std::string& text) {
  return Document(status, fmt::format("<?xml version=\"1.0\"?>\n<error status=\"{}\">{}</error>\n",
                                      status, EscapeXml(text)));
}

std::string Preset(int pan) {
  return fmt::format("<?xml version=\"1.0\"?>\n<preset><pan>{}</pan></preset>\n", pan);
}

class XmlStore : public Profile {
 public:
  XmlStore() : documents_{{"1", Preset(10)}, {"2", Preset(20)}, {"7", Preset(70)}} {}

  Response Respond(const Exchange& exchange) override {
    const Request& request = exchange.request;
    const std::string& path = request.path;
    const std::lock_guard<std::mutex> lock(mutex_);
    if (path == kDirectory || path == std::string(kDirectory) + "/") return Directory(request);
    const std::string start = std::string(kDirectory) + "/";
    if (path.compare(0, start.size(), start) != 0) {
      return Problem(404, "The documents are below /presets.");
    }
    return Entry(request, path.substr(start.size()));
  }

 private:
  Response Directory(const Request& request) {
    if (request.method == "GET" || request.method == "HEAD") return List();
    if (request.method != "POST") return Problem(405, "The directory takes GET and POST.");
    if (!ParseXmlRequest(request.body).well_formed) return Problem(400, "That is no XML.");
    if (documents_.size() >= kMostDocuments) return Problem(507, "The store is full.");
    while (documents_.count(std::to_string(next_)) > 0) ++next_;
    const std::string name = std::to_string(next_++);
    documents_[name] = request.body;
    Response response = Document(201, request.body);
    response.Set("Location", std::string(kDirectory) + "/" + name);
    return response;
  }

  Response Entry(const Request& request, const std::string& name) {
    if (request.method == "PUT") return Put(request, name);
    const auto found = documents_.find(name);
    if (found == documents_.end()) return Problem(404, "There is no document \"" + name + "\".");
    if (request.method == "GET" || request.method == "HEAD") return Document(200, found->second);
    if (request.method != "DELETE") return Problem(405, "A document takes GET, PUT and DELETE.");
    documents_.erase(found);
    return Document(200, "<?xml version=\"1.0\"?>\n<deleted/>\n");
  }

  Response Put(const Request& request, const std::string& name) {
    if (!ParseXmlRequest(request.body).well_formed) return Problem(400, "That is no XML.");
    if (documents_.size() >= kMostDocuments) return Problem(507, "The store is full.");
    const bool is_new = documents_.count(name) == 0;
    documents_[name] = request.body;
    return Document(is_new ? 201 : 200, request.body);
  }

  Response List() {
    std::string text = "<?xml version=\"1.0\"?>\n<presets>\n";
    for (const auto& [name, document] : documents_) {
      text += fmt::format("  <document href=\"{}/{}\" bytes=\"{}\"/>\n", kDirectory,
                          EscapeXml(name), document.size());
    }
    return Document(200, text + "</presets>\n");
  }

  std::mutex mutex_;
  std::map<std::string, std::string> documents_;
  int next_ = 1;
};

}  // namespace

ProfileType StoreProfile() {
  return {"store",
          "none",
          "a REST store of XML documents in memory: GET and POST /presets; GET, PUT and DELETE "
          "/presets/NAME (1, 2 and 7 are there at start)",
          {},
          [](const ProfileOptions&, std::string*) -> std::unique_ptr<Profile> {
            return std::make_unique<XmlStore>();
          }};
}
