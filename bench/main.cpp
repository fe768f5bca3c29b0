// Runs one operation, or lists them, or compares their times with their floors'.
#include <alloca.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "bench/idle_clients.h"
#include "bench/operations.h"

// The name by which bench/count finds what is to be counted.
extern "C" __attribute__((noinline)) void MeasuredRun(Operation* operation, int count) {
  operation->Run(count);
  asm volatile("");  // not the last call, or it would become a jump
}

namespace {

// With the stack so many bytes further down.
__attribute__((noinline)) void RunLower(size_t bytes, Operation* operation, int count) {
  Use(alloca(bytes));
  MeasuredRun(operation, count);
}

// The C library's comparisons take a longer way where a text crosses a cache line. Where in a line
// the stack begins is the kernel's choice, so a fourth of the calls is made at each of the places.
void RunAtAllPlaces(Operation* operation, int count) {
  constexpr int kPlaces = 4;
  constexpr size_t kStackAlignment = 16;
  for (int i = 0; i < kPlaces; ++i) {
    const int calls = count * (i + 1) / kPlaces - count * i / kPlaces;
    RunLower(kStackAlignment * static_cast<size_t>(i), operation, calls);
  }
}

constexpr int kRounds = 15;
constexpr double kRoundSeconds = 0.01;

std::vector<Entry> AllEntries() {
  std::vector<Entry> entries;
  AddLogOperations(&entries);
  AddRequestOperations(&entries);
  AddHeadOperations(&entries);
  AddBodyOperations(&entries);
  AddEncodingOperations(&entries);
  return entries;
}

const Entry* Find(const std::vector<Entry>& entries, const std::string& name) {
  const auto found = std::find_if(entries.begin(), entries.end(),
                                  [&](const Entry& entry) { return entry.name == name; });
  return found == entries.end() ? nullptr : &*found;
}

// One call before the counted ones: the first one of a process resolves symbols and builds tables.
int RunOnce(const Entry& entry, int count) {
  const auto operation = entry.make();
  operation->Run(1);
  RunAtAllPlaces(operation.get(), count);
  return 0;
}

double Seconds(Operation* operation, int count) {
  const auto start = std::chrono::steady_clock::now();
  operation->Run(count);
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

// How many calls fill a round.
int CallsPerRound(Operation* operation) {
  int count = 1;
  while (Seconds(operation, count) < kRoundSeconds && count < (1 << 28)) count *= 2;
  return count;
}

double Median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

// The two in turn, round by round, so that both see the same machine.
void Compare(const Entry& entry, const Entry& floor) {
  const auto operation = entry.make();
  const auto base = floor.make();
  const int count = CallsPerRound(operation.get());
  const int baseCount = CallsPerRound(base.get());
  std::vector<double> times, ratios;
  for (int round = 0; round < kRounds; ++round) {
    times.push_back(Seconds(operation.get(), count) / count);
    ratios.push_back(times.back() / (Seconds(base.get(), baseCount) / baseCount));
  }
  const double best = *std::min_element(times.begin(), times.end());
  std::printf("%s %.1f %.2f", entry.name.c_str(), best * 1e9, Median(ratios));
  if (entry.bytes != 0) std::printf(" %.2f", static_cast<double>(entry.bytes) / best / 1e9);
  std::printf("\n");
  std::fflush(stdout);
}

int CompareAll(const std::vector<Entry>& entries, const char* prefix) {
  for (const Entry& entry : entries) {
    const Entry* const floor = Find(entries, entry.floor);
    if (floor != nullptr && entry.name.rfind(prefix, 0) == 0) Compare(entry, *floor);
  }
  return 0;
}

int List(const std::vector<Entry>& entries) {
  for (const Entry& entry : entries) std::printf("%s %d\n", entry.name.c_str(), entry.count);
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  const std::vector<Entry> entries = AllEntries();
  const std::string command = argc > 1 ? argv[1] : "";
  if (command == "list" && argc == 2) return List(entries);
  if (command == "time") return CompareAll(entries, argc > 2 ? argv[2] : "");
  if (command == "idle" && argc == 3) return MeasureIdleClients(std::atoi(argv[2]));
  const Entry* const entry = command == "run" && argc == 4 ? Find(entries, argv[2]) : nullptr;
  if (entry != nullptr) return RunOnce(*entry, std::atoi(argv[3]));
  std::fprintf(stderr,
               "usage: tarnwick_bench list | run OPERATION COUNT | time [PREFIX] | idle CLIENTS\n"
               "list: operations and counts; time: nanoseconds, ratio to the floor, GB/s;\n"
               "idle: kilobytes that a client keeps resident after a small GET\n");
  return 2;
}
