#include "tests/support/syslog_capture.h"

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <cstring>
#include <regex>

namespace {

constexpr char kSocketPath[] = "/dev/log";

SyslogMessage Parse(const std::string& datagram) {
  static const std::regex head(R"(<(\d+)>[A-Z][a-z]{2} [ \d]\d \d\d:\d\d:\d\d [^:]*: )");
  std::smatch match;
  if (!std::regex_search(datagram, match, head, std::regex_constants::match_continuous)) {
    ADD_FAILURE() << "not a system log message: " << datagram;
    return {-1, -1, datagram};
  }
  const int code = std::stoi(match[1]);
  return {code & LOG_PRIMASK, code & LOG_FACMASK, match.suffix()};
}

}  // namespace

SyslogCapture::SyslogCapture() : fd_(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
  closelog();  // a connection to an earlier listener would swallow the first message
  unlink(kSocketPath);
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  memcpy(address.sun_path, kSocketPath, sizeof(kSocketPath));
  if (bind(fd_, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0) {
    ADD_FAILURE() << kSocketPath << ": " << strerror(errno);
  }
}

SyslogCapture::~SyslogCapture() {
  close(fd_);
  unlink(kSocketPath);
  closelog();
}

std::vector<SyslogMessage> SyslogCapture::Take() {
  std::vector<SyslogMessage> messages;
  char buf[8192];
  for (ssize_t n; (n = recv(fd_, buf, sizeof(buf), MSG_DONTWAIT)) > 0;) {
    messages.push_back(Parse(std::string(buf, static_cast<size_t>(n))));
  }
  return messages;
}
