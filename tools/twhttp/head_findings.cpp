// What is odd about a response's head, and what the library makes of it.
#include <algorithm>

#include "tarnwick/http/kept_fields.h"
#include "tools/common/text.h"
#include "tools/twhttp/message.h"

namespace {

constexpr size_t kLibraryLine = 2047;
constexpr size_t kLibraryLines = 30;

struct LineFacts {
  size_t longest = 0;
  int bare_line_feeds = 0;
  bool null_bytes = false;
  std::string without_colon;  // the first such line
  bool without_name = false;
  bool only_delimiters = false;
};

// `line` is one after the status line, without its end.
void MeasureHeader(const std::string& line, LineFacts* facts) {
  if (line.empty()) return;
  const size_t colon = line.find(':');
  if (colon == std::string::npos && facts->without_colon.empty()) facts->without_colon = line;
  if (colon == 0) facts->without_name = true;
  // What the library takes for ends of a name.
  if (line.find_first_not_of(" :;=") == std::string::npos) facts->only_delimiters = true;
}

LineFacts Measure(const std::string& head) {
  LineFacts facts;
  for (size_t begin = 0; begin < head.size();) {
    const size_t end = std::min(head.find('\n', begin), head.size());
    facts.longest = std::max(facts.longest, end - begin);
    const size_t text = end > begin && head[end - 1] == '\r' ? end - 1 : end;
    if (begin > 0) MeasureHeader(head.substr(begin, text - begin), &facts);
    if (end < head.size() && (end == begin || head[end - 1] != '\r')) ++facts.bare_line_feeds;
    begin = end + 1;
  }
  facts.null_bytes = head.find('\0') != std::string::npos;
  return facts;
}

std::string FirstLine(const std::string& head) {
  constexpr size_t kShown = 40;
  return head.substr(0, std::min(head.find_first_of("\r\n"), kShown));
}

size_t CountOf(const HeaderLines& headers, const std::string& name) {
  return static_cast<size_t>(std::count_if(headers.begin(), headers.end(), [&](const auto& header) {
    return EqualsIgnoringCase(header.first, name);
  }));
}

void InspectLines(const ResponseMessage& response, std::vector<HeadFinding>* found) {
  const LineFacts facts = Measure(response.Head());
  if (facts.longest > kLibraryLine) {
    found->push_back({"a head line of " + std::to_string(facts.longest) + " bytes",
                      "the library cuts a line at 2,047 bytes and takes the rest for another line",
                      true});
  }
  if (response.Headers().size() > kLibraryLines) {
    found->push_back({std::to_string(response.Headers().size()) + " header lines",
                      "the library reads 30; the others are taken for the beginning of the body",
                      true});
  }
  if (facts.bare_line_feeds > 0) {
    found->push_back({std::to_string(facts.bare_line_feeds) + " head lines end in a bare line feed",
                      "the library takes either line end"});
  }
  if (facts.null_bytes) {
    found->push_back({"zero bytes in the head", "the library's line ends at the first of them"});
  }
  if (!facts.without_colon.empty()) {
    found->push_back({"a header line without a colon: " + facts.without_colon.substr(0, 60),
                      "the library takes its first word for the name"});
  }
  if (facts.only_delimiters) {
    found->push_back({"a header line without a name and without a value",
                      "the library takes the whole head for malformed", true});
  } else if (facts.without_name) {
    found->push_back({"a header line that begins with its colon",
                      "the library takes the next word for the name"});
  }
  for (const tarnwick::KeptField& field : tarnwick::kKeptFields) {
    const std::string name(field.name);
    if (CountOf(response.Headers(), name) == 0 || !response.Value(name).empty()) continue;
    const bool breaks = response.Head().find(name + ":\r\n") != std::string::npos;
    found->push_back({"an empty " + name + " line",
                      breaks ? "the library takes the whole head for malformed"
                             : "the blank in it keeps the library from refusing the head",
                      breaks});
  }
}

void InspectFraming(const ResponseMessage& response, std::vector<HeadFinding>* found) {
  const std::string coding = response.Value("Transfer-Encoding");
  const std::string length = response.Value("Content-Length");
  if (!length.empty() && length.find_first_not_of("0123456789") != std::string::npos) {
    found->push_back({"Content-Length: " + length + " is no length",
                      "only a SOAP response needs one; libcurl refuses the head"});
  }
  if (CountOf(response.Headers(), "Content-Length") > 1) {
    found->push_back({"more than one Content-Length", "the library keeps the first of them"});
  }
  if (!coding.empty() && !response.Value("Content-Length").empty()) {
    found->push_back({"a Content-Length beside a Transfer-Encoding", "the chunks count"});
  }
  if (!response.Value("Content-Encoding").empty()) {
    found->push_back({"Content-Encoding: " + response.Value("Content-Encoding"),
                      "the library decodes none, and hands the body on as it is"});
  }
  if (!coding.empty() && coding != "chunked") {
    found->push_back({"Transfer-Encoding: " + coding,
                      "the library decodes \"chunked\" alone, in lower case; the chunk lines stay "
                      "in the body",
                      true});
  }
}

}  // namespace

std::vector<HeadFinding> InspectHead(const ResponseMessage& response) {
  std::vector<HeadFinding> found;
  const std::string& head = response.Head();
  const std::string start = head.substr(0, 8);
  const bool known = start == "HTTP/1.0" || start == "HTTP/1.1";
  const bool complete = head.find('\n') != std::string::npos;
  if (known && complete && response.Interims() == 0 && response.Status() < 100) {
    found.push_back({"the status line has no status of three digits: " + FirstLine(head),
                     "the library takes it for no success", true});
  }
  if (!head.empty() && !known) {
    found.push_back({"the response begins with \"" + FirstLine(head) + "\"",
                     "the library reads responses of HTTP/1.0 and HTTP/1.1", true});
  }
  if (response.Interims() > 0) {
    found.push_back({"an interim response of status 100 to 199 came first",
                     "the library takes it for the response", true});
  }
  InspectLines(response, &found);
  if (response.HeadComplete()) InspectFraming(response, &found);
  return found;
}
