// Faults of the status line and the headers.
#include <fmt/format.h>

#include <algorithm>
#include <cctype>

#include "tools/twcamsim/faults.h"

namespace {

constexpr char kGroup[] = "head";

FaultType Make(const char* name, const char* meaning, void (*hook)(Steps*, const FaultContext&),
               std::vector<ArgumentRule> rules = {}) {
  FaultHooks hooks;
  hooks.steps = hook;
  return {name, kGroup, std::move(rules), meaning, hooks};
}

bool IsHead(Part part) {
  return part == Part::kStatusLine || part == Part::kHeader || part == Part::kBlank;
}

void ReplaceLineEnds(Steps* steps, const std::string& end) {
  for (Step& step : *steps) {
    if (!IsHead(step.part)) continue;
    for (size_t at = 0; (at = step.bytes.find("\r\n", at)) != std::string::npos; at += end.size()) {
      step.bytes.replace(at, 2, end);
    }
  }
}

void AddLine(Steps* steps, const std::string& line) {
  const auto blank = static_cast<Steps::difference_type>(FindPart(*steps, Part::kBlank));
  steps->insert(steps->begin() + blank, {Action::kSend, Part::kHeader, line, {}});
}

Step* StatusLine(Steps* steps) {
  const size_t at = FindPart(*steps, Part::kStatusLine);
  return at < steps->size() ? &(*steps)[at] : nullptr;
}

// Puts `text` in place of the bytes `first` to `last` of the status line, its line end excluded.
void EditStatus(Steps* steps, size_t first, size_t last, const std::string& text) {
  Step* line = StatusLine(steps);
  if (!line) return;
  const std::string& bytes = line->bytes;
  const size_t end = std::min({last, bytes.find_first_of("\r\n"), bytes.size()});
  if (first > end) return;  // another fault has shortened it
  line->bytes.replace(first, end - first, text);
}

void Informational(Steps* steps, const FaultContext& context) {
  std::string heads;
  for (int64_t i = 0; i < context.Number(0); ++i) heads += "HTTP/1.1 100 Continue\r\n\r\n";
  steps->insert(steps->begin(), {Action::kSend, Part::kInterim, heads, {}});
}

void ManyLines(Steps* steps, const FaultContext& context) {
  std::string lines;
  for (int64_t i = 0; i < context.Number(0); ++i) lines += fmt::format("X-Filler-{0}: {0}\r\n", i);
  AddLine(steps, lines);
}

void ManyLinesFirst(Steps* steps, const FaultContext& context) {
  std::string lines;
  for (int64_t i = 0; i < context.Number(0); ++i) lines += fmt::format("X-Filler-{0}: {0}\r\n", i);
  const size_t first = std::min(FindPart(*steps, Part::kStatusLine) + 1, steps->size());
  steps->insert(steps->begin() + static_cast<Steps::difference_type>(first),
                {Action::kSend, Part::kHeader, lines, {}});
}

void LongLine(Steps* steps, const FaultContext& context) {
  AddLine(steps, "X-Long: " + std::string(static_cast<size_t>(context.Number(0)), 'x') + "\r\n");
}

void LongStatus(Steps* steps, const FaultContext& context) {
  EditStatus(steps, 13, std::string::npos,
             std::string(static_cast<size_t>(context.Number(0)), 'x'));
}

void LowerCase(Steps* steps, const FaultContext&) {
  for (Step& step : *steps) {
    if (step.part != Part::kHeader) continue;
    const size_t colon = std::min(step.bytes.find(':'), step.bytes.size());
    for (size_t i = 0; i < colon; ++i) {
      step.bytes[i] = static_cast<char>(std::tolower(step.bytes[i]));
    }
  }
}

void BlankBeforeColon(Steps* steps, const FaultContext&) {
  for (Step& step : *steps) {
    const size_t colon = step.bytes.find(':');
    if (step.part == Part::kHeader && colon != std::string::npos) step.bytes.insert(colon, " ");
  }
}

void NoBlankLine(Steps* steps, const FaultContext&) {
  const size_t blank = FindPart(*steps, Part::kBlank);
  if (blank == steps->size()) return;
  steps->resize(blank);
  steps->push_back({Action::kClose, Part::kBlank, "", {}});
}

void NoStatusLine(Steps* steps, const FaultContext&) {
  if (Step* line = StatusLine(steps)) line->bytes.clear();
}

std::vector<FaultType> StatusFaults() {
  return {
      Make("no-status-line", "the response begins with its headers", NoStatusLine),
      Make("http-2-status", "the status line says HTTP/2.0",
           [](Steps* steps, const FaultContext&) { EditStatus(steps, 0, 8, "HTTP/2.0"); }),
      Make("other-protocol", "the response is a line of another protocol",
           [](Steps* steps, const FaultContext&) {
             *steps = {{Action::kSend, Part::kStatusLine, "220 camera service ready\r\n", {}},
                       {Action::kClose, Part::kBody, "", {}}};
           }),
      Make("status-code", "the status line has that text as its code, whatever it is",
           [](Steps* steps, const FaultContext& context) {
             EditStatus(steps, 9, 12, context.Text(0));
           },
           {{"TEXT", "2OO"}}),
      Make("no-code", "the status line ends after the version",
           [](Steps* steps, const FaultContext&) { EditStatus(steps, 8, std::string::npos, ""); }),
      Make("no-reason", "the status line ends after the code",
           [](Steps* steps, const FaultContext&) { EditStatus(steps, 12, std::string::npos, ""); }),
      Make("long-status", "the status line's reason has so many bytes", LongStatus,
           {{"BYTES", "4000", 1, 64 << 20}}),
      Make("informational", "so many \"100 Continue\" heads come first", Informational,
           {{"COUNT", "1", 1, 10000}}),
  };
}

std::vector<FaultType> LineFaults() {
  return {
      Make("bare-lf", "the head's lines end with a line feed alone",
           [](Steps* steps, const FaultContext&) { ReplaceLineEnds(steps, "\n"); }),
      Make("cr-only", "the head's lines end with a carriage return alone",
           [](Steps* steps, const FaultContext&) { ReplaceLineEnds(steps, "\r"); }),
      Make("head-lines", "so many more headers after the usual ones", ManyLines,
           {{"COUNT", "100", 1, 1000000}}),
      Make("head-lines-first", "so many more headers in front of the usual ones", ManyLinesFirst,
           {{"COUNT", "100", 1, 1000000}}),
      Make("long-line", "a header of so many bytes", LongLine, {{"BYTES", "10485760", 1, 1 << 30}}),
      Make("no-colon", "a header without a colon",
           [](Steps* steps, const FaultContext&) { AddLine(steps, "X-No-Colon 17\r\n"); }),
      Make("empty-name", "a header that begins with its colon",
           [](Steps* steps, const FaultContext&) { AddLine(steps, ": nameless\r\n"); }),
      Make("only-colon", "a header that is a colon alone",
           [](Steps* steps, const FaultContext&) { AddLine(steps, ":\r\n"); }),
      Make("folded-header", "a header that goes on in the next line",
           [](Steps* steps, const FaultContext&) { AddLine(steps, "X-Folded: one\r\n\ttwo\r\n"); }),
      Make("zero-in-head", "a zero byte in a header",
           [](Steps* steps, const FaultContext&) {
             AddLine(steps, std::string("X-Zero: a\0b\r\n", 13));
           }),
      Make("lower-case-head", "the headers' names are in lower case", LowerCase),
      Make("blank-before-colon", "a blank in front of each header's colon", BlankBeforeColon),
      Make("no-blank-line", "the connection closes instead of the blank line", NoBlankLine),
  };
}

void SetStatus(Response* response, const FaultContext& context) {
  response->status = static_cast<int>(context.Number(0));
}

void Redirect(Response* response, const FaultContext& context) {
  const std::string& where = context.Text(0);
  *response = MakeResponse(302, "text/plain", "elsewhere\n");
  response->Set("Location", where == "-" && context.request ? context.request->target : where);
}

std::vector<FaultType> ResponseFaults() {
  FaultHooks status, redirect;
  status.response = SetStatus;
  redirect.response = Redirect;
  return {
      {"status",
       kGroup,
       {{"CODE", "500", 100, 999}},
       "the response has that status (302, 404, 414, 500, 503 ...)",
       status},
      {"redirect",
       kGroup,
       {{"WHERE", "-"}},
       "302 with that Location; -: to the same place, without an end",
       redirect},
  };
}

}  // namespace

std::vector<FaultType> HeadFaults() {
  std::vector<FaultType> types = StatusFaults();
  for (const auto part : {LineFaults, ResponseFaults}) {
    for (FaultType& type : part()) types.push_back(std::move(type));
  }
  return types;
}
