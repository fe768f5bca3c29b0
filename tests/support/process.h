// Child processes, threads with small stacks, and the process's descriptors.
#ifndef TARNWICK_TESTS_SUPPORT_PROCESS_H_
#define TARNWICK_TESTS_SUPPORT_PROCESS_H_

#include <sys/types.h>

#include <chrono>
#include <cstddef>
#include <functional>
#include <map>
#include <string>
#include <vector>

struct ChildResult {
  bool exited = false;     // false: ended by `signal` or timed out
  int code = -1;           // exit code
  int signal = 0;          // the signal that ended it
  bool timed_out = false;  // it was killed because it ran too long
};

// A fork()ed child that runs `body` and exits with its result; 99 when a check in it failed.
// Destruction ends a child that still runs.
class Child {
 public:
  explicit Child(const std::function<int()>& body);
  ~Child();
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;

  pid_t Pid() const { return pid_; }

  // Waits for its end; after `limit` it is killed.
  ChildResult Wait(std::chrono::milliseconds limit = std::chrono::seconds(60));

 private:
  pid_t pid_;
};

// Runs `body` in a child and waits for it.
ChildResult RunInChild(const std::function<int()>& body,
                       std::chrono::milliseconds limit = std::chrono::seconds(60));

// What a child runs to become another program, whose standard output goes to `output`. It ends with
// 127 and a message when there is no such program.
[[noreturn]] void Execute(const std::vector<std::string>& command, int output);

// True when the test program is built for another processor and runs in an emulator.
bool IsEmulated();

// Why tests are skipped there. What they prove holds on a real kernel.
inline constexpr char kNoHighSelect[] = "the emulator's select ends at descriptor 1,023";
inline constexpr char kNoCountdown[] = "the emulator's select forgets the time that a signal cut";

// The command that runs a program: in an emulated test with the emulator in front, when the program
// is built for the same processor as the test.
std::vector<std::string> Runnable(const std::vector<std::string>& command);

// Runs a program, by its Runnable command, and waits for it; `output` receives what it writes to
// standard output. Its error output is the test's own, because the sanitizers and the coverage
// counters write there too.
ChildResult RunProgram(const std::vector<std::string>& command, std::string* output = nullptr,
                       std::chrono::milliseconds limit = std::chrono::seconds(60));

// Runs `body` on a new thread whose stack holds `bytes`, and waits for it. Sanitizers multiply what
// a function needs, so the stack is larger under them.
void RunOnSmallStack(size_t bytes, const std::function<void()>& body);

// The process's open descriptors and what each stands for.
std::map<int, std::string> OpenDescriptors();

// Expects, when it goes out of scope, the descriptors that were open when it was made.
class DescriptorGuard {
 public:
  DescriptorGuard() : before_(OpenDescriptors()) {}
  ~DescriptorGuard();
  DescriptorGuard(const DescriptorGuard&) = delete;
  DescriptorGuard& operator=(const DescriptorGuard&) = delete;

 private:
  std::map<int, std::string> before_;
};

#endif  // TARNWICK_TESTS_SUPPORT_PROCESS_H_
