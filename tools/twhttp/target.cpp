#include "tools/twhttp/target.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>

namespace {

constexpr int kHttpPort = 80;
constexpr int kHttpsPort = 443;

int HexValue(char c) {
  const char lower = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  if (std::isdigit(static_cast<unsigned char>(lower)) != 0) return lower - '0';
  return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

std::string PercentDecoded(const std::string& text) {
  std::string result;
  for (size_t i = 0; i < text.size(); ++i) {
    const bool coded = text[i] == '%' && i + 2 < text.size() && HexValue(text[i + 1]) >= 0 &&
                       HexValue(text[i + 2]) >= 0;
    result +=
        coded ? static_cast<char>(HexValue(text[i + 1]) * 16 + HexValue(text[i + 2])) : text[i];
    if (coded) i += 2;
  }
  return result;
}

std::string PercentEncoded(const std::string& text) {
  std::string result;
  for (const char c : text) {
    const bool plain = std::isalnum(static_cast<unsigned char>(c)) != 0 || c == '-' || c == '_' ||
                       c == '.' || c == '~' || c == '*';
    char code[4];
    snprintf(code, sizeof(code), "%%%02X", static_cast<unsigned>(static_cast<unsigned char>(c)));
    result += plain ? std::string(1, c) : code;
  }
  return result;
}

void TakeLogin(const std::string& text, Target* target) {
  const size_t colon = std::min(text.find(':'), text.size());
  target->has_credentials = true;
  target->user = PercentDecoded(text.substr(0, colon));
  target->password = PercentDecoded(text.substr(std::min(colon + 1, text.size())));
}

bool TakePort(const std::string& text, Target* target, std::string* error) {
  constexpr long kMost = 65535;
  char* end = nullptr;
  const long port = std::strtol(text.c_str(), &end, 10);
  if (text.empty() || *end != '\0' || port < 1 || port > kMost) {
    *error = "\"" + text + "\" is no port (1 to 65535)";
    return false;
  }
  target->port = static_cast<int>(port);
  return true;
}

// What is in front of "://", when there is something.
bool TakeScheme(std::string* rest, Target* target, std::string* error) {
  const size_t found = rest->find("://");
  if (found == std::string::npos) return true;
  const std::string scheme = rest->substr(0, found);
  target->https = scheme == "https";
  if (scheme != "http" && scheme != "https") {
    *error = "the scheme \"" + scheme + "\" is neither http nor https";
    return false;
  }
  *rest = rest->substr(found + 3);
  return true;
}

}  // namespace

bool ParseTarget(const std::string& text, Target* target, std::string* error) {
  std::string rest = text;
  *target = Target();
  if (!TakeScheme(&rest, target, error)) return false;
  target->port = target->https ? kHttpsPort : kHttpPort;
  const size_t authority_end = std::min(rest.find_first_of("/?"), rest.size());
  std::string authority = rest.substr(0, authority_end);
  target->path = rest.substr(authority_end);
  while (!target->path.empty() && target->path.front() == '/') target->path.erase(0, 1);
  const size_t at = authority.rfind('@');
  if (at != std::string::npos) {
    TakeLogin(authority.substr(0, at), target);
    authority = authority.substr(at + 1);
  }
  const size_t colon = authority.rfind(':');
  target->host = authority.substr(0, colon);
  if (target->host.empty()) {
    *error = "the target has no host";
    return false;
  }
  if (target->host.front() == '[') {
    *error = "the library connects by IPv4 alone";
    return false;
  }
  return colon == std::string::npos || TakePort(authority.substr(colon + 1), target, error);
}

std::string Target::HostAndPort() const {
  return host + ":" + std::to_string(port);
}

std::string Target::Url(bool with_password) const {
  std::string url = https ? "https://" : "http://";
  if (has_credentials) {
    url += PercentEncoded(user) + ":" + (with_password ? PercentEncoded(password) : "***") + "@";
  }
  url += host;
  if (port != (https ? kHttpsPort : kHttpPort)) url += ":" + std::to_string(port);
  return url + "/" + path;
}
