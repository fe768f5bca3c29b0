#include "bench/apart.h"

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>

namespace {

class Apart : public Contender {
 public:
  Apart(std::string work, std::string contender)
      : m_work(std::move(work)), m_contender(std::move(contender)) {}

  double Measure(int count) override {
    return NumberPrintedBy({"/proc/self/exe", "--one", m_work, "--contender", m_contender,
                            "--count", std::to_string(count)});
  }

 private:
  const std::string m_work;
  const std::string m_contender;
};

std::string ReadAll(int fd) {
  std::string text;
  char piece[256];
  for (ssize_t count; (count = read(fd, piece, sizeof(piece))) > 0;) {
    text.append(piece, static_cast<size_t>(count));
  }
  return text;
}

}  // namespace

std::unique_ptr<Contender> MakeApart(const std::string& work, const std::string& contender) {
  return std::make_unique<Apart>(work, contender);
}

double NumberPrintedBy(const std::vector<std::string>& command) {
  int ends[2];
  Expect(pipe(ends) == 0, command[0].c_str(), "has no pipe");
  std::vector<char*> arguments;
  for (const std::string& argument : command) {
    arguments.push_back(const_cast<char*>(argument.c_str()));
  }
  arguments.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
  posix_spawn_file_actions_addclose(&actions, ends[0]);
  posix_spawn_file_actions_addclose(&actions, ends[1]);
  pid_t child = -1;
  const int error = posix_spawn(&child, arguments[0], &actions, nullptr, arguments.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  close(ends[1]);
  Expect(error == 0, command[0].c_str(), "cannot be started");
  const std::string text = ReadAll(ends[0]);
  close(ends[0]);
  int status = 0;
  waitpid(child, &status, 0);
  Expect(status == 0 && !text.empty(), command[0].c_str(), "measured nothing");
  return std::strtod(text.c_str(), nullptr);
}
