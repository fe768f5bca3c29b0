#include "tools/twlogctl/doctor.h"

#include <json/value.h>

#include <cstdio>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/twlogctl/commands.h"

namespace {

const char* WordOf(Verdict verdict) {
  switch (verdict) {
    case Verdict::kRight:
      return "ok";
    case Verdict::kNote:
      return "note";
    case Verdict::kWrong:
      return "wrong";
  }
  return "";
}

Colour ColourOf(Verdict verdict) {
  if (verdict == Verdict::kWrong) return Colour::kRed;
  return verdict == Verdict::kRight ? Colour::kGreen : Colour::kYellow;
}

void PrintText(const Finding& finding, bool colour) {
  std::string word = WordOf(finding.verdict);
  word.resize(5, ' ');
  printf("%s  %-9s %s\n", InColour(ColourOf(finding.verdict), word, colour).c_str(),
         finding.check.c_str(), EscapeControls(finding.text, Backslash::kKept).c_str());
  if (!finding.fix.empty())
    printf("       fix:      %s\n", EscapeControls(finding.fix, Backslash::kKept).c_str());
}

void PrintJson(const Finding& finding) {
  Json::Value line;
  line["check"] = finding.check;
  line["verdict"] = WordOf(finding.verdict);
  line["text"] = finding.text;
  if (!finding.fix.empty()) line["fix"] = finding.fix;
  PrintJsonLine(line);
}

}  // namespace

int RunDoctor(bool json) {
  Findings findings;
  for (const auto check : {CheckDirectory, CheckSpace, CheckFiles, CheckLocks, CheckFileSizeLimits,
                           CheckRecord, CheckLevels, CheckDaemons, CheckSettings, CheckRotation}) {
    check(&findings);
  }
  const bool colour = MayColour(1);
  size_t wrong = 0;
  for (const Finding& finding : findings) {
    if (finding.verdict == Verdict::kWrong) ++wrong;
    json ? PrintJson(finding) : PrintText(finding, colour);
  }
  if (!json && wrong == 0) puts("\nnothing is wrong");
  if (!json && wrong > 0) printf("\n%zu %s wrong\n", wrong, wrong == 1 ? "thing is" : "things are");
  return wrong == 0 ? kExitDone : kExitWrong;
}
