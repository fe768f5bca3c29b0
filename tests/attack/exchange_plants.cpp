#include "tests/attack/exchange_plants.h"

#include <unistd.h>

#include <cstdlib>
#include <memory>
#include <mutex>
#include <stdexcept>

namespace {

// Kept where the leak sanitizer sees them: memory that grows has to be noticed without it.
void GrowMemory() {
  constexpr size_t kSize = 1 << 20;
  static std::mutex mutex;
  static std::vector<std::unique_ptr<std::string>> kept;
  const std::lock_guard<std::mutex> lock(mutex);
  kept.push_back(std::make_unique<std::string>(kSize, 'x'));
}

// A line of the peer's in the first request.
void SplitRequest(PeerRecord* record) {
  if (record->connections.empty()) return;
  std::string& bytes = record->connections[0];
  const size_t end = bytes.find("\r\n");
  if (end != std::string::npos) bytes.insert(end, "\r\nX-Split: yes");
}

}  // namespace

// "log" is the scope that is missing, and has nothing to do here.
const std::vector<std::string>& ExchangePlants() {
  static const std::vector<std::string> plants = {
      "status", "body", "result", "split", "log", "slow", "throw", "memory", "descriptor", "crash"};
  return plants;
}

void PlantInCall(const std::string& kind) {
  if (kind == "slow") usleep(static_cast<useconds_t>(kPlantedDelay * 1e6));
  if (kind == "throw") throw std::runtime_error("planted");
  if (kind == "memory") GrowMemory();
  if (kind == "descriptor" && dup(STDERR_FILENO) < 0) abort();
  if (kind == "crash") {
    volatile char* const nowhere = nullptr;
    *nowhere = 1;
  }
}

void PlantInExchange(const std::string& kind, HostileExchange* exchange, Played* played) {
  for (Delivery& delivery : exchange->deliveries) {
    if (kind == "status") delivery.response.status += delivery.response.status < 300 ? 100 : -200;
    if (kind == "body") delivery.response.content += "x";
  }
  if (kind == "result") played->outcome.result = 77;
  if (kind == "split") SplitRequest(&played->record);
}
