// The responses to XML requests. Line 1: the sizes of the pieces that libcurl delivers. The rest is
// the responses; <<get>> parses what has come, <<lost>> is an allocation that failed.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/oracle/xml_response.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "fuzz/support/xml.h"
#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/http/twhttp.h"

using namespace tarnwick;

namespace {

constexpr std::string_view kGet = "<<get>>";
constexpr std::string_view kLost = "<<lost>>";

class Client : public TWHttpClient {
 public:
  Client() = default;

  // As the requests do: the two fields are the buffer.
  void Receive(std::string piece) {
    CurlBufferWrite(piece.data(), 1, piece.size(), &m_pRespBuf);
    responses_.Add(piece);
    CheckFields();
  }

  void Lose() {
    std::free(m_pRespBuf);
    m_pRespBuf = nullptr;
    responses_.Lose();
    CheckFields();
  }

  void Parse() {
    xmlDoc before = {};
    xmlDoc* doc = &before;
    const bool parsed = GetResponseXML(doc);
    const std::optional<std::string> text = responses_.Take();
    CheckFields();
    if (!text) {
      Expect("without a response nothing is parsed", !parsed && doc == &before);
      return;
    }
    const std::string reports = TakeXmlReports();
    ExpectSame("the document", XmlText(doc), XmlTextOf(*text));
    ExpectSame("what is reported", reports, TakeXmlReports());
    ExpectSame("the result", parsed, doc != nullptr);
    xmlFreeDoc(doc);
  }

 private:
  void CheckFields() const {
    ExpectSame("having a response", m_pRespBuf != nullptr, responses_.There());
    ExpectSame("the response's size", m_respLen, static_cast<int64_t>(responses_.Size()));
  }

  oracle::Responses responses_;
};

std::string_view TakeMark(std::string_view* text) {
  for (const std::string_view mark : {kGet, kLost}) {
    if (text->substr(0, mark.size()) != mark) continue;
    text->remove_prefix(mark.size());
    return mark;
  }
  return {};
}

void Play(std::string_view input, const std::vector<size_t>& sizes) {
  Client client;
  for (size_t n = 0; !input.empty(); ++n) {
    const std::string_view mark = TakeMark(&input);
    if (mark == kGet) client.Parse();
    if (mark == kLost) client.Lose();
    if (!mark.empty()) continue;
    // A piece ends where the next mark may begin.
    const size_t size = std::min(input.find("<<", 1), sizes[n % sizes.size()]);
    const std::string piece(input.substr(0, size));
    input.remove_prefix(piece.size());
    client.Receive(piece);
  }
  client.Parse();
  client.Parse();  // the second one finds nothing
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  LogEverything();
  WatchXml();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view input(reinterpret_cast<const char*>(data), size);
  std::vector<size_t> sizes = Options(TakeLine(&input)).Numbers();
  if (sizes.empty()) sizes.push_back(16384);
  Play(input, sizes);
  return 0;
}
