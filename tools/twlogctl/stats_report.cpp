#include "tools/twlogctl/stats_report.h"

#include <json/value.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/common/units.h"
#include "tools/twlogctl/log_plot.h"
#include "tools/twlogctl/processes.h"

namespace {

constexpr size_t kNameWidth = 24;
constexpr size_t kTableWidth = 58;  // in front of the bars
constexpr size_t kPlotRows = 4;
constexpr char kNoName[] = "(no name)";

double Seconds(const StatsReport& report) {
  const auto span = report.end - report.begin;
  return std::max(1.0, static_cast<double>(span.count()) / 1000);
}

// The name of a process that still runs: its number may be another one's by now, which the manual
// page says.
std::string CommandOf(const StatsReport& report, const std::string& pid) {
  if (!report.own_processes || pid.empty()) return "";
  const auto process = ReadProcess(static_cast<pid_t>(std::strtol(pid.c_str(), nullptr, 10)));
  return process ? process->name : "";
}

std::string Row(const std::string& name, const LogAmount& amount, double seconds) {
  char numbers[128];
  snprintf(numbers, sizeof(numbers), "%10llu %10.2f %10s/s",
           static_cast<unsigned long long>(amount.lines),
           static_cast<double>(amount.lines) / seconds,
           FormatBytes(static_cast<double>(amount.bytes) / seconds).c_str());
  std::string label = EscapeControls(name.empty() ? kNoName : name.substr(0, kNameWidth));
  label.resize(std::max(label.size(), kNameWidth), ' ');
  return label + numbers;
}

// The bars compare the lines of one kind.
void AddTable(const StatsReport& report, const StatsLayout& layout, const std::string& title,
              const NamedAmounts& amounts, std::vector<std::string>* lines) {
  lines->push_back(InColour(Colour::kBold, title, layout.colour));
  const auto sorted = LoudestFirst(amounts);
  for (size_t i = 0; i < sorted.size() && i < layout.most; ++i) {
    const auto& [name, amount] = sorted[i];
    const std::string command = title == "process" ? CommandOf(report, name) : "";
    std::string shown = name;
    if (!command.empty()) shown.append(" ").append(command);
    std::string row = Row(shown, amount, Seconds(report));
    const double part = static_cast<double>(amount.lines) /
                        static_cast<double>(std::max<uint64_t>(sorted[0].second.lines, 1));
    if (layout.width > kTableWidth + 10) {
      row += " " + InColour(Colour::kCyan,
                            PlotBar(part, layout.width - kTableWidth - 3, layout.blocks),
                            layout.colour);
    }
    lines->push_back(row);
  }
}

void AddPlot(const StatsReport& report, const StatsLayout& layout,
             std::vector<std::string>* lines) {
  const int64_t begin = SecondOf(report.begin);
  const int64_t end = std::max(SecondOf(report.end - std::chrono::milliseconds(1)), begin) + 1;
  const std::vector<double> values =
      PlotColumns(report.lines_by_second, begin, end, std::max<size_t>(layout.width - 2, 10));
  char title[96];
  snprintf(title, sizeof(title), "lines a second, at most %.2f",
           *std::max_element(values.begin(), values.end()));
  lines->push_back(InColour(Colour::kBold, title, layout.colour));
  for (const std::string& row : PlotRows(values, kPlotRows, layout.blocks)) {
    lines->push_back(" " + InColour(Colour::kCyan, row, layout.colour));
  }
  const std::string first = FormatClock(report.begin);
  const std::string last = FormatClock(report.end);
  const size_t gap = std::max(values.size(), first.size() + last.size() + 1) - first.size();
  lines->push_back(" " + first + std::string(gap - last.size(), ' ') + last);
}

Json::Value JsonOf(const StatsReport& report, const char* kind, const std::string& name,
                   const LogAmount& amount) {
  Json::Value value(Json::objectValue);
  value["by"] = kind;
  value["name"] = name.empty() ? Json::Value() : Json::Value(name);
  value["lines"] = static_cast<Json::UInt64>(amount.lines);
  value["bytes"] = static_cast<Json::UInt64>(amount.bytes);
  value["lines_per_second"] = static_cast<double>(amount.lines) / Seconds(report);
  value["bytes_per_second"] = static_cast<double>(amount.bytes) / Seconds(report);
  return value;
}

bool PrintKind(const StatsReport& report, const char* kind, const NamedAmounts& amounts) {
  for (const auto& [name, amount] : LoudestFirst(amounts)) {
    if (!PrintJsonLine(JsonOf(report, kind, name, amount))) return false;
  }
  return true;
}

}  // namespace

std::vector<std::string> StatsLines(const StatsReport& report, const StatsLayout& layout) {
  std::vector<std::string> lines;
  lines.push_back(report.source + ", " + FormatMoment(report.begin, false) + " to " +
                  FormatMoment(report.end, false) + ", " + FormatSpan(report.end - report.begin));
  char heading[128];
  snprintf(heading, sizeof(heading), "%-*s%10s %10s %12s", static_cast<int>(kNameWidth), "",
           "lines", "lines/s", "bytes/s");
  lines.push_back(InColour(Colour::kBold, heading, layout.colour));
  lines.push_back(Row("all", report.amounts.all, Seconds(report)));
  AddTable(report, layout, "category", report.amounts.categories, &lines);
  AddTable(report, layout, "level", report.amounts.levels, &lines);
  AddTable(report, layout, "process", report.amounts.processes, &lines);
  AddPlot(report, layout, &lines);
  return lines;
}

bool PrintStatsJson(const StatsReport& report) {
  Json::Value all = JsonOf(report, "all", "", report.amounts.all);
  all["since"] = FormatIso(report.begin);
  all["until"] = FormatIso(report.end);
  all["seconds"] = Seconds(report);
  return PrintJsonLine(all) && PrintKind(report, "category", report.amounts.categories) &&
         PrintKind(report, "level", report.amounts.levels) &&
         PrintKind(report, "process", report.amounts.processes);
}
