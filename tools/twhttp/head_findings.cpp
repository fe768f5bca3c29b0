// What is odd about a reply's head, and what the library makes of it.
#include <algorithm>

#include "tarnwick/http/kept_fields.h"
#include "tools/twhttp/message.h"

namespace {

constexpr size_t kLibraryLine = 2047;
constexpr size_t kLibraryLines = 30;

struct LineFacts {
  size_t longest = 0;
  int bareLineFeeds = 0;
  bool nullBytes = false;
  std::string withoutColon;  // the first such line
  bool withoutName = false;
  bool onlyDelimiters = false;
};

// `line` is one behind the status line, without its end.
void MeasureHeader(const std::string& line, LineFacts* facts) {
  if (line.empty()) return;
  const size_t colon = line.find(':');
  if (colon == std::string::npos && facts->withoutColon.empty()) facts->withoutColon = line;
  if (colon == 0) facts->withoutName = true;
  // What the library takes for ends of a name.
  if (line.find_first_not_of(" :;=") == std::string::npos) facts->onlyDelimiters = true;
}

LineFacts Measure(const std::string& head) {
  LineFacts facts;
  for (size_t begin = 0; begin < head.size();) {
    const size_t end = std::min(head.find('\n', begin), head.size());
    facts.longest = std::max(facts.longest, end - begin);
    const size_t text = end > begin && head[end - 1] == '\r' ? end - 1 : end;
    if (begin > 0) MeasureHeader(head.substr(begin, text - begin), &facts);
    if (end < head.size() && (end == begin || head[end - 1] != '\r')) ++facts.bareLineFeeds;
    begin = end + 1;
  }
  facts.nullBytes = head.find('\0') != std::string::npos;
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

void InspectLines(const ReplyMessage& reply, std::vector<HeadFinding>* found) {
  const LineFacts facts = Measure(reply.Head());
  if (facts.longest > kLibraryLine) {
    found->push_back({"a head line of " + std::to_string(facts.longest) + " bytes",
                      "the library cuts a line at 2,047 bytes and takes the rest for another line",
                      true});
  }
  if (reply.Headers().size() > kLibraryLines) {
    found->push_back({std::to_string(reply.Headers().size()) + " header lines",
                      "the library reads 30; the others are taken for the beginning of the body",
                      true});
  }
  if (facts.bareLineFeeds > 0) {
    found->push_back({std::to_string(facts.bareLineFeeds) + " head lines end in a bare line feed",
                      "the library takes either line end"});
  }
  if (facts.nullBytes) {
    found->push_back({"zero bytes in the head", "the library's line ends at the first of them"});
  }
  if (!facts.withoutColon.empty()) {
    found->push_back({"a header line without a colon: " + facts.withoutColon.substr(0, 60),
                      "the library takes its first word for the name"});
  }
  if (facts.onlyDelimiters) {
    found->push_back({"a header line without a name and without a value",
                      "the library takes the whole head for malformed", true});
  } else if (facts.withoutName) {
    found->push_back({"a header line that begins with its colon",
                      "the library takes the next word for the name"});
  }
  for (const tarnwick::KeptField& field : tarnwick::kKeptFields) {
    const std::string name(field.name);
    if (CountOf(reply.Headers(), name) == 0 || !reply.Value(name).empty()) continue;
    const bool breaks = reply.Head().find(name + ":\r\n") != std::string::npos;
    found->push_back({"an empty " + name + " line",
                      breaks ? "the library takes the whole head for malformed"
                             : "the blank in it keeps the library from refusing the head",
                      breaks});
  }
}

void InspectFraming(const ReplyMessage& reply, std::vector<HeadFinding>* found) {
  const std::string coding = reply.Value("Transfer-Encoding");
  const std::string length = reply.Value("Content-Length");
  if (!length.empty() && length.find_first_not_of("0123456789") != std::string::npos) {
    found->push_back({"Content-Length: " + length + " is no length",
                      "only a SOAP reply needs one; libcurl refuses the head"});
  }
  if (CountOf(reply.Headers(), "Content-Length") > 1) {
    found->push_back({"more than one Content-Length", "the library keeps the first of them"});
  }
  if (!coding.empty() && !reply.Value("Content-Length").empty()) {
    found->push_back({"a Content-Length beside a Transfer-Encoding", "the chunks count"});
  }
  if (!reply.Value("Content-Encoding").empty()) {
    found->push_back({"Content-Encoding: " + reply.Value("Content-Encoding"),
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

std::vector<HeadFinding> InspectHead(const ReplyMessage& reply) {
  std::vector<HeadFinding> found;
  const std::string& head = reply.Head();
  const std::string start = head.substr(0, 8);
  const bool known = start == "HTTP/1.0" || start == "HTTP/1.1";
  const bool complete = head.find('\n') != std::string::npos;
  if (known && complete && reply.Interims() == 0 && reply.Status() < 100) {
    found.push_back({"the status line has no status of three digits: " + FirstLine(head),
                     "the library takes it for no success", true});
  }
  if (!head.empty() && !known) {
    found.push_back({"the reply begins with \"" + FirstLine(head) + "\"",
                     "the library reads replies of HTTP/1.0 and HTTP/1.1", true});
  }
  if (reply.Interims() > 0) {
    found.push_back({"an interim reply of status 100 to 199 came first",
                     "the library takes it for the reply", true});
  }
  InspectLines(reply, &found);
  if (reply.HeadComplete()) InspectFraming(reply, &found);
  return found;
}
