#include "tests/support/process.h"

#include <dirent.h>
#include <elf.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <pthread.h>
#include <signal.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#ifdef TARNWICK_COVERAGE
extern "C" void __gcov_dump();
#endif
#ifndef TARNWICK_TEST_EMULATOR
#define TARNWICK_TEST_EMULATOR
#endif

namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr int kFailedCheck = 99;

// The words in front of an emulated program's name.
const std::vector<std::string>& Emulator() {
  static const std::vector<std::string> words = {TARNWICK_TEST_EMULATOR};
  return words;
}

// The processor that a program is built for; EM_NONE for a script. The header begins alike for
// all word sizes.
Elf32_Half MachineOf(const std::string& program) {
  Elf32_Ehdr header = {};
  std::ifstream(program, std::ios::binary).read(reinterpret_cast<char*>(&header), sizeof(header));
  const bool is_elf = std::string(header.e_ident, header.e_ident + SELFMAG) == ELFMAG;
  return is_elf ? header.e_machine : static_cast<Elf32_Half>(EM_NONE);
}

[[noreturn]] void RunBody(const std::function<int()>& body) {
  const int result = body();
  const bool failed = ::testing::Test::HasFailure();
  fflush(nullptr);
#ifdef TARNWICK_COVERAGE
  __gcov_dump();  // _exit would lose the child's counts of executed lines
#endif
  _exit(failed ? kFailedCheck : result);
}

bool WaitUntil(pid_t pid, steady_clock::time_point deadline, int* status) {
  while (waitpid(pid, status, WNOHANG) == 0) {
    if (steady_clock::now() > deadline) return false;
    usleep(2000);
  }
  return true;
}

// Reads until the other end closes or the deadline passes.
std::string Drain(int fd, steady_clock::time_point deadline) {
  std::string text;
  char buf[4096];
  while (steady_clock::now() < deadline) {
    pollfd waiting = {fd, POLLIN, 0};
    if (poll(&waiting, 1, 100) <= 0) continue;
    const ssize_t n = read(fd, buf, sizeof(buf));
    if (n <= 0) break;
    text.append(buf, static_cast<size_t>(n));
  }
  return text;
}

void* CallBody(void* body) {
  (*static_cast<const std::function<void()>*>(body))();
  return nullptr;
}

size_t StackSize(size_t bytes) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  return 8 * bytes + (512 << 10);
#else
  return bytes;
#endif
}

}  // namespace

Child::Child(const std::function<int()>& body) : pid_(fork()) {
  if (pid_ == 0) RunBody(body);
  if (pid_ < 0) ADD_FAILURE() << "fork failed with errno " << errno;
}

Child::~Child() {
  if (pid_ <= 0) return;
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
}

ChildResult Child::Wait(milliseconds limit) {
  ChildResult result;
  if (pid_ <= 0) return result;
  int status = 0;
  if (!WaitUntil(pid_, steady_clock::now() + limit, &status)) {
    result.timed_out = true;
    kill(pid_, SIGKILL);
    waitpid(pid_, &status, 0);
  }
  pid_ = -1;
  result.exited = WIFEXITED(status);
  result.code = result.exited ? WEXITSTATUS(status) : -1;
  result.signal = WIFSIGNALED(status) ? WTERMSIG(status) : 0;
  return result;
}

void Execute(const std::vector<std::string>& command, int output) {
  std::vector<char*> argv;
  for (const std::string& word : command) argv.push_back(const_cast<char*>(word.c_str()));
  argv.push_back(nullptr);
  dup2(output, STDOUT_FILENO);
  execvp(argv[0], argv.data());
  perror(argv[0]);
  _exit(127);
}

ChildResult RunInChild(const std::function<int()>& body, milliseconds limit) {
  return Child(body).Wait(limit);
}

bool IsEmulated() {
  return !Emulator().empty();
}

std::vector<std::string> Runnable(const std::vector<std::string>& command) {
  if (!IsEmulated() || MachineOf(command[0]) != MachineOf("/proc/self/exe")) return command;
  std::vector<std::string> words = Emulator();
  words.insert(words.end(), command.begin(), command.end());
  // For the emulator, /proc/self would be its own directory.
  words[Emulator().size()] = std::filesystem::canonical(command[0]);
  return words;
}

ChildResult RunProgram(const std::vector<std::string>& command, std::string* output,
                       milliseconds limit) {
  const std::vector<std::string> words = Runnable(command);
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    ADD_FAILURE() << "no pipe";
    return {};
  }
  const auto deadline = steady_clock::now() + limit;
  Child child([&]() -> int { Execute(words, ends[1]); });
  close(ends[1]);
  const std::string text = Drain(ends[0], deadline);
  close(ends[0]);
  if (output != nullptr) *output = text;
  return child.Wait(std::chrono::duration_cast<milliseconds>(deadline - steady_clock::now()));
}

void RunOnSmallStack(size_t bytes, const std::function<void()>& body) {
  pthread_attr_t attr;
  pthread_attr_init(&attr);
  EXPECT_EQ(pthread_attr_setstacksize(&attr, StackSize(bytes)), 0);
  pthread_t thread;
  const int result =
      pthread_create(&thread, &attr, CallBody, const_cast<void*>(static_cast<const void*>(&body)));
  pthread_attr_destroy(&attr);
  ASSERT_EQ(result, 0);
  pthread_join(thread, nullptr);
}

std::map<int, std::string> OpenDescriptors() {
  std::map<int, std::string> open;
  DIR* directory = opendir("/proc/self/fd");
  if (directory == nullptr) return open;
  while (const dirent* entry = readdir(directory)) {
    const int fd = atoi(entry->d_name);
    if (entry->d_name[0] == '.' || fd == dirfd(directory)) continue;
    char target[256];
    const std::string link = std::string("/proc/self/fd/") + entry->d_name;
    const ssize_t length = readlink(link.c_str(), target, sizeof(target));
    open[fd] = std::string(target, length > 0 ? static_cast<size_t>(length) : 0);
  }
  closedir(directory);
  return open;
}

DescriptorGuard::~DescriptorGuard() {
  EXPECT_THAT(OpenDescriptors(), ::testing::ContainerEq(before_)) << "open descriptors changed";
}
