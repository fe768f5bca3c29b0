#include "tools/twcamsim/endpoint.h"

#include <fmt/format.h>

#include <algorithm>

#include "tools/common/text.h"

namespace {

using Option = std::pair<std::string, std::string>;

std::vector<Option> SplitOptions(const std::string& text) {
  std::vector<Option> options;
  for (size_t at = 0; at <= text.size();) {
    const size_t end = std::min(text.find(',', at), text.size());
    const std::string part = text.substr(at, end - at);
    const size_t equals = std::min(part.find('='), part.size());
    options.emplace_back(part.substr(0, equals), part.substr(std::min(equals + 1, part.size())));
    at = end + 1;
  }
  return options;
}

bool HasOption(const std::vector<ProfileOption>& table, const std::string& name) {
  return std::any_of(table.begin(), table.end(),
                     [&](const ProfileOption& option) { return name == option.name; });
}

std::string Suggest(const std::string& name, const std::vector<std::string>& names) {
  const std::string hint = DidYouMean(name, names);
  return hint.empty() ? "" : "; " + hint;
}

std::string UnknownProfile(const std::string& name) {
  std::vector<std::string> names;
  for (const ProfileType& type : ProfileTypes()) names.emplace_back(type.name);
  return fmt::format("there is no profile \"{}\"{}", name, Suggest(name, names));
}

std::string UnknownOption(const ProfileType& type, const std::string& name) {
  std::vector<std::string> names;
  for (const ProfileOption& option : CommonOptions()) names.emplace_back(option.name);
  for (const ProfileOption& option : type.options) names.emplace_back(option.name);
  return fmt::format("profile {} has no option \"{}\"{}", type.name, name, Suggest(name, names));
}

bool SetPort(const std::string& text, Endpoint* endpoint, std::string* error) {
  int64_t port = 0;
  if (!NumberOption({{"port", text}}, "port", 0, 65535, &port, error)) return false;
  endpoint->port = static_cast<uint16_t>(port);
  return true;
}

bool SetAuthentication(const std::string& text, Endpoint* endpoint, std::string* error) {
  endpoint->authentication_style = text;
  if (FindAuthenticationStyle(text)) return true;
  std::vector<std::string> names;
  for (const AuthenticationStyle& style : AuthenticationStyles()) names.push_back(style.name);
  *error = fmt::format("there is no style of authentication \"{}\"{}", text, Suggest(text, names));
  return false;
}

bool AddFault(const std::string& text, Endpoint* endpoint, std::string* error) {
  Fault fault;
  if (!ParseFault(text, ':', ':', &fault, error)) return false;
  endpoint->faults.push_back(fault);
  return true;
}

// The options of the account are read before there is an endpoint.
bool SetCommon(const Option& option, Endpoint* endpoint, std::string* error) {
  const auto& [name, value] = option;
  if (name == "port") return SetPort(value, endpoint, error);
  if (name == "login") return SetAuthentication(value, endpoint, error);
  if (name == "fault") return AddFault(value, endpoint, error);
  if (name == "tls" && !value.empty()) {
    *error = "tls takes no value";
    return false;
  }
  if (name == "name") endpoint->name = value;
  if (name == "host") endpoint->host = value;
  if (name == "tls") endpoint->tls = true;
  return true;
}

Account AccountOf(const std::vector<Option>& options) {
  Account account = {"operator", "gate-7", "camera"};
  for (const auto& [name, value] : options) {
    if (name == "user") account.user = value;
    if (name == "password") account.password = value;
    if (name == "realm") account.realm = value;
  }
  return account;
}

bool ApplyOptions(const std::vector<Option>& options, Endpoint* endpoint, std::string* error) {
  ProfileOptions own;
  for (size_t i = 1; i < options.size(); ++i) {
    if (HasOption(CommonOptions(), options[i].first)) {
      if (!SetCommon(options[i], endpoint, error)) return false;
    } else if (HasOption(endpoint->type->options, options[i].first)) {
      own[options[i].first] = options[i].second;
    } else {
      *error = UnknownOption(*endpoint->type, options[i].first);
      return false;
    }
  }
  endpoint->profile = endpoint->type->make(own, error);
  if (!endpoint->profile) return false;
  if (endpoint->profile->WantsTls()) endpoint->tls = true;
  const std::string fault = endpoint->profile->OwnFault();
  return fault.empty() || AddFault(fault, endpoint, error);
}

}  // namespace

std::unique_ptr<Endpoint> ParseEndpoint(const std::string& text, std::string* error) {
  const std::vector<Option> options = SplitOptions(text);
  const ProfileType* type = FindProfile(options[0].first);
  if (!type) {
    *error = UnknownProfile(options[0].first);
    return nullptr;
  }
  auto endpoint = std::make_unique<Endpoint>(type, AccountOf(options));
  endpoint->authentication_style = type->authentication;
  if (!ApplyOptions(options, endpoint.get(), error)) {
    *error = "endpoint " + text + ": " + *error;
    return nullptr;
  }
  if (endpoint->name.empty())
    endpoint->name = type->name + std::string(endpoint->tls ? "-tls" : "");
  return endpoint;
}

const std::vector<ProfileOption>& CommonOptions() {
  static const std::vector<ProfileOption> kOptions = {
      {"port", "NUMBER", "the port; 0, the default: any free one"},
      {"host", "ADDRESS", "the address to listen at instead of --listen's"},
      {"tls", "", "with TLS"},
      {"name", "TEXT", "the name in the list of ports and in the journal"},
      {"login", "STYLE", "the authentication that is asked for (--list-logins)"},
      {"user", "TEXT", "the user that may log in; the default is operator"},
      {"password", "TEXT", "the password; the default is gate-7"},
      {"realm", "TEXT", "the realm; the default is camera"},
      {"fault", "NAME[:ARG[:ARG]]", "a fault of this endpoint alone; may come several times"},
  };
  return kOptions;
}

const std::vector<std::string>& DefaultEndpoints() {
  static const std::vector<std::string> kEndpoints = {
      "json",  "json,tls", "cgi",       "cgi-basic", "cgi-digest", "soap",
      "store", "snapshot", "multipart", "upload",    "site",       "site,tls",
  };
  return kEndpoints;
}
