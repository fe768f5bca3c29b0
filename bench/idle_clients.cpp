#include "bench/idle_clients.h"

#include <unistd.h>

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "bench/peer.h"
#include "tarnwick/http/twhttp.h"

namespace {

double ResidentKilobytes() {
  FILE* const file = std::fopen("/proc/self/statm", "r");
  if (file == nullptr) return 0;
  long total = 0, resident = 0;
  if (std::fscanf(file, "%ld %ld", &total, &resident) != 2) resident = 0;
  std::fclose(file);
  return static_cast<double>(resident) * static_cast<double>(sysconf(_SC_PAGESIZE)) / 1024;
}

void AddClients(int count, int port, std::vector<std::unique_ptr<TWHttpClient>>* clients) {
  for (int i = 0; i < count; ++i) {
    clients->push_back(std::make_unique<TWHttpClient>("127.0.0.1", port, "api/info", "", "", 5,
                                                      false, true, false, false, HTTP_VERSION_NONE,
                                                      ""));
    std::string body;
    clients->back()->SendRequestByGet();
    clients->back()->ReadBody(body);
  }
}

}  // namespace

int MeasureIdleClients(int count) {
  const Peer peer({"HTTP/1.0 200 OK\r\nContent-Type: text/plain\r\n\r\nsmall"});
  std::vector<std::unique_ptr<TWHttpClient>> clients;
  AddClients(10, peer.Port(), &clients);
  const double before = ResidentKilobytes();
  AddClients(count, peer.Port(), &clients);
  std::printf("%.1f\n", (ResidentKilobytes() - before) / count);
  return 0;
}
