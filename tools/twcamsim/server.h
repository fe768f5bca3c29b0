// The listening endpoints and the life of the program.
#ifndef TARNWICK_TOOLS_TWCAMSIM_SERVER_H_
#define TARNWICK_TOOLS_TWCAMSIM_SERVER_H_

#include <json/value.h>

#include <chrono>
#include <memory>
#include <string>
#include <vector>

#include "tools/twcamsim/endpoint.h"
#include "tools/twcamsim/session.h"

// Threads: one.
class Server {
 public:
  Server(SharedState* shared, std::vector<std::unique_ptr<Endpoint>> endpoints);
  ~Server();
  Server(const Server&) = delete;
  Server& operator=(const Server&) = delete;

  // Takes all ports.
  // Results: false with the reason in `error`.
  bool Listen(std::string* error);

  // Each endpoint with its address and its account.
  Json::Value Describe() const;

  // Serves until SIGTERM or SIGINT comes, or until `limit` has passed when it is not zero. All
  // connections have ended when it returns.
  void Run(std::chrono::milliseconds limit);

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_SERVER_H_
