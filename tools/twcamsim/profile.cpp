#include "tools/twcamsim/profile.h"

#include <fmt/format.h>

#include <charconv>

bool Profile::TakesStream(const Request& /*request*/) const {
  return false;
}

std::string Profile::LoginFor(const Request& /*request*/) const {
  return "";
}

bool Profile::WantsTls() const {
  return false;
}

std::string Profile::OwnFault() const {
  return "";
}

const std::vector<ProfileType>& ProfileTypes() {
  static const std::vector<ProfileType> kTypes = [] {
    std::vector<ProfileType> types = {JsonProfile()};
    for (ProfileType& type : CgiProfiles()) types.push_back(std::move(type));
    for (const auto make : {SoapProfile, StoreProfile, SnapshotProfile, MultipartProfile,
                            UploadProfile, SiteProfile, ReplayProfile}) {
      types.push_back(make());
    }
    return types;
  }();
  return kTypes;
}

const ProfileType* FindProfile(const std::string& name) {
  for (const ProfileType& type : ProfileTypes()) {
    if (name == type.name) return &type;
  }
  return nullptr;
}

bool NumberOption(const ProfileOptions& options, const char* name, int64_t least, int64_t most,
                  int64_t* value, std::string* error) {
  const auto found = options.find(name);
  if (found == options.end()) return true;
  const std::string& text = found->second;
  const auto [end, code] = std::from_chars(text.data(), text.data() + text.size(), *value);
  if (code == std::errc() && end == text.data() + text.size() && *value >= least &&
      *value <= most) {
    return true;
  }
  *error = fmt::format("{} is \"{}\", not a number from {} to {}", name, text, least, most);
  return false;
}
