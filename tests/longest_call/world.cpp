#include "tests/longest_call/world.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>

#include "tests/longest_call/slow_bytes.h"
#include "tests/support/files.h"
#include "tests/support/ports.h"

namespace {

constexpr char kResolverFile[] = "/etc/resolv.conf";
constexpr size_t kRecordHead = 5;
constexpr unsigned char kApplicationData = 23;

sockaddr_in LoopbackAt(int port) {
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return address;
}

int ConnectTo(int port) {
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  const sockaddr_in address = LoopbackAt(port);
  if (connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0) return fd;
  close(fd);
  return -1;
}

bool ReceiveAll(int fd, char* bytes, size_t size) {
  return size == 0 || recv(fd, bytes, size, MSG_WAITALL) == static_cast<ssize_t>(size);
}

bool SendAll(int fd, const std::string& bytes) {
  return send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(bytes.size());
}

// Reads a whole TLS record. Results: empty at the end of the stream.
std::string ReceiveRecord(int fd) {
  std::string record(kRecordHead, '\0');
  if (!ReceiveAll(fd, &record[0], kRecordHead)) return "";
  const auto high = static_cast<unsigned char>(record[3]);
  const auto low = static_cast<unsigned char>(record[4]);
  const size_t size = static_cast<size_t>(high << 8 | low);
  record.resize(kRecordHead + size);
  return ReceiveAll(fd, &record[kRecordHead], size) ? record : "";
}

bool SendSlowly(int fd, const std::string& record) {
  for (size_t i = 0; i < kSlowBytes; ++i) {
    std::this_thread::sleep_for(std::chrono::duration<double>(kBetweenSlowBytes));
    if (!SendAll(fd, record.substr(i, 1))) return false;
  }
  return SendAll(fd, record.substr(kSlowBytes));
}

void PassRecords(int from, int to) {
  for (std::string record; !(record = ReceiveRecord(from)).empty();) {
    const bool slow = static_cast<unsigned char>(record[0]) == kApplicationData;
    if (!(slow ? SendSlowly(to, record) : SendAll(to, record))) break;
  }
  shutdown(to, SHUT_WR);
}

void PassBytes(int from, int to) {
  char bytes[4096];
  for (ssize_t count; (count = recv(from, bytes, sizeof(bytes), 0)) > 0;) {
    if (!SendAll(to, std::string(bytes, static_cast<size_t>(count)))) break;
  }
  shutdown(to, SHUT_RDWR);  // a server that stalls would keep the other direction open
}

}  // namespace

SilentNameServer::SilentNameServer() : fd_(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
  constexpr int kNameServerPort = 53;
  const sockaddr_in address = LoopbackAt(kNameServerPort);
  const TempDir folder;
  const std::string file = folder.File("resolv.conf");
  std::ofstream(file) << "nameserver 127.0.0.1\noptions timeout:1 attempts:2\n";
  if (bind(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0 ||
      mount(file.c_str(), kResolverFile, nullptr, MS_BIND, nullptr) != 0) {
    std::perror("longest_call: no silent name server");
    std::exit(2);
  }
}

SilentNameServer::~SilentNameServer() {
  umount2(kResolverFile, MNT_DETACH);
  close(fd_);
}

bool RepeatConnectsOnce() {
  std::ofstream setting("/proc/sys/net/ipv4/tcp_syn_retries");
  return static_cast<bool>(setting << "1\n" << std::flush);
}

SlowRelay::SlowRelay(int serverPort) : listener_(BindLoopback(&port_)) {
  listen(listener_, 1);
  thread_ = std::thread([this, serverPort] { Run(serverPort); });
}

SlowRelay::~SlowRelay() {
  shutdown(listener_, SHUT_RDWR);
  thread_.join();
  close(listener_);
}

void SlowRelay::Run(int serverPort) {
  const int client = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
  if (client == -1) return;
  const int server = ConnectTo(serverPort);
  std::thread requests([=] { PassBytes(client, server); });
  PassRecords(server, client);
  requests.join();
  close(server);
  close(client);
}
