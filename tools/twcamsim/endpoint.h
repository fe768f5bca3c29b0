// An endpoint: an address, what responds there and what is wrong with it.
#ifndef TARNWICK_TOOLS_TWCAMSIM_ENDPOINT_H_
#define TARNWICK_TOOLS_TWCAMSIM_ENDPOINT_H_

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "tools/twcamsim/authenticator.h"
#include "tools/twcamsim/faults.h"
#include "tools/twcamsim/profile.h"

struct Endpoint {
  Endpoint(const ProfileType* profile_type, Account account)
      : type(profile_type), authenticator(std::move(account)) {}

  const ProfileType* type;
  std::string name;
  int index = 0;
  std::string host;
  uint16_t port = 0;  // 0 until it listens, unless one was asked for
  bool tls = false;
  std::string authentication_style;
  Authenticator authenticator;
  std::unique_ptr<Profile> profile;
  std::vector<Fault> faults;
  std::atomic<int> connections{0};
};

// Makes an endpoint from "PROFILE[,OPTION[=VALUE]]...".
// Results: nullptr with a sentence in `error`.
std::unique_ptr<Endpoint> ParseEndpoint(const std::string& text, std::string* error);

// The options that every profile takes.
const std::vector<ProfileOption>& CommonOptions();

// What is started when no endpoint is asked for.
const std::vector<std::string>& DefaultEndpoints();

#endif  // TARNWICK_TOOLS_TWCAMSIM_ENDPOINT_H_
