// What an endpoint responds with.
#ifndef TARNWICK_TOOLS_TWCAMSIM_PROFILE_H_
#define TARNWICK_TOOLS_TWCAMSIM_PROFILE_H_

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "tools/twcamsim/random.h"
#include "tools/twcamsim/request.h"
#include "tools/twcamsim/response.h"

// The options of an endpoint that its profile takes, by their names.
using ProfileOptions = std::map<std::string, std::string>;

// Takes the next bytes of a request's body; false when the peer's direction has ended.
using BodySource = std::function<bool(std::string* bytes)>;

// One request that has passed the authentication.
struct Exchange {
  const Request& request;
  const std::string& user;  // whose credentials came; empty without any
  Random* random;
  BodySource* source;  // of a request that TakesStream; else nullptr
};

// Threads: any; requests of several connections come at the same time.
class Profile {
 public:
  virtual ~Profile() = default;

  virtual Response Respond(const Exchange& exchange) = 0;

  // True when the body of `request` goes to Respond piece by piece. The connection closes after the
  // response.
  virtual bool TakesStream(const Request& request) const;

  // The name of the authentication style for that request; empty: the endpoint's.
  virtual std::string LoginFor(const Request& request) const;

  // True when an endpoint of this profile speaks TLS without being asked to.
  virtual bool WantsTls() const;

  // The fault that the whole endpoint has by its nature; empty: none.
  virtual std::string OwnFault() const;
};

struct ProfileOption {
  const char* name;
  const char* argument;
  const char* meaning;
};

struct ProfileType {
  const char* name;
  const char* authentication;  // the style when the endpoint has no option "login"
  const char* meaning;
  std::vector<ProfileOption> options;
  // Results: nullptr with a sentence in `error` when an option's value is wrong.
  std::unique_ptr<Profile> (*make)(const ProfileOptions& options, std::string* error);
};

// The table of profiles, made from the functions below.
const std::vector<ProfileType>& ProfileTypes();

// nullptr when there is none of that name.
const ProfileType* FindProfile(const std::string& name);

// The number in `options`, the default when it is not there.
// Results: false with a sentence in `error` when it is no number from `least` to `most`.
bool NumberOption(const ProfileOptions& options, const char* name, int64_t least, int64_t most,
                  int64_t* value, std::string* error);

// One file each.
ProfileType JsonProfile();
std::vector<ProfileType> CgiProfiles();
ProfileType SoapProfile();
ProfileType StoreProfile();
ProfileType SnapshotProfile();
ProfileType MultipartProfile();
ProfileType UploadProfile();
ProfileType SiteProfile();
ProfileType ReplayProfile();

#endif  // TARNWICK_TOOLS_TWCAMSIM_PROFILE_H_
