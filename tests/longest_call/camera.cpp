#include "tests/longest_call/camera.h"

#include <fcntl.h>
#include <json/reader.h>
#include <json/value.h>
#include <poll.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <sstream>

namespace {

constexpr std::chrono::seconds kStart{30};
constexpr std::chrono::seconds kEnd{10};

// Results: the first line; empty when none came in time.
std::string ReadLine(int fd) {
  const auto deadline = std::chrono::steady_clock::now() + kStart;
  std::string line;
  while (std::chrono::steady_clock::now() < deadline) {
    pollfd waiting = {fd, POLLIN, 0};
    if (poll(&waiting, 1, 100) <= 0) continue;
    char bytes[4096];
    const ssize_t count = read(fd, bytes, sizeof(bytes));
    if (count <= 0) return "";
    line.append(bytes, static_cast<size_t>(count));
    if (line.back() == '\n') return line;
  }
  return "";
}

// The camera's line tells its endpoints in the order of the command line.
std::vector<int> PortsOf(const std::string& line) {
  std::vector<int> ports;
  Json::Value report;
  if (!line.empty()) std::istringstream(line) >> report;
  for (const Json::Value& endpoint : report["endpoints"]) {
    ports.push_back(endpoint["port"].asInt());
  }
  return ports;
}

}  // namespace

SimulatedCamera::SimulatedCamera(const std::string& program,
                                 const std::vector<std::string>& endpoints, int hold) {
  std::vector<std::string> command = {
      program, "--dir", folder_.Path(), "--hold", std::to_string(hold) + "s", "--for", "2m"};
  for (const std::string& endpoint : endpoints) {
    command.insert(command.end(), {"-e", endpoint});
  }
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) return;
  process_ = std::make_unique<Child>([&]() -> int { Execute(command, ends[1]); });
  close(ends[1]);
  ports_ = PortsOf(ReadLine(ends[0]));
  close(ends[0]);
}

SimulatedCamera::~SimulatedCamera() {
  if (!Serves()) return;  // a child that still runs goes with its object
  kill(process_->Pid(), SIGTERM);
  process_->Wait(kEnd);
}
