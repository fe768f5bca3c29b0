#include "fuzz/oracle/shared/model_credentials.h"

#include <unistd.h>

#include <cstdlib>
#include <string>

#include "fuzz/oracle/shared/plain_md5.h"

namespace {

const char kQuote[] = "\"";

std::string Strip(std::string text, char c) {
  while (!text.empty() && text.front() == c) text.erase(0, 1);
  while (!text.empty() && text.back() == c) text.pop_back();
  return text;
}

std::string ParameterOf(const std::string& challenge, const std::string& name) {
  const size_t at = challenge.find(name);
  if (at == std::string::npos) return "";
  const size_t equals = challenge.find('=', at);
  if (equals == std::string::npos) return "";
  const std::string rest = challenge.substr(equals + 1);
  return Strip(Strip(rest.substr(0, rest.find(',')), ' '), '"');
}

std::string ClientNonce(long time) {
  unsigned seed = static_cast<unsigned>(getpid()) * static_cast<unsigned>(time);
  std::string bytes;
  for (int i = 0; i < 16; ++i) bytes += static_cast<char>(rand_r(&seed) & 0xff);
  return HexOf(bytes);
}

std::string DigestOfRequest(const std::string& method, const std::string& uri,
                            const std::string& qop) {
  PlainMd5 md5;
  md5.Add(method + ":" + uri);
  if (qop == "auth-int") md5.Add(":" + md5.Finish());
  return md5.Finish();
}

char Lower(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

}  // namespace

std::string ModelBasicLine(const ModelCredentials& credentials) {
  static const char kDigits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  const std::string both = credentials.user + ":" + credentials.password;
  const std::string text = both.c_str();  // a zero byte ends it
  std::string bits;
  for (const char c : text) {
    for (int i = 7; i >= 0; --i) bits += (static_cast<unsigned char>(c) >> i & 1) != 0 ? '1' : '0';
  }
  while (bits.size() % 6 != 0) bits += '0';
  std::string encoded;
  for (size_t i = 0; i < bits.size(); i += 6) {
    encoded += kDigits[std::strtol(bits.substr(i, 6).c_str(), nullptr, 2)];
  }
  while (encoded.size() % 4 != 0) encoded += '=';
  return "Authorization: Basic " + encoded;
}

std::string ModelDigestLine(const ModelCredentials& credentials, const std::string& challenge,
                            const std::string& method, const std::string&, long time) {
  const std::string realm = ParameterOf(challenge, "realm");
  const std::string nonce = ParameterOf(challenge, "nonce");
  const std::string qop = ParameterOf(challenge, "qop");
  const std::string algorithm = ParameterOf(challenge, "algorithm");
  const std::string opaque = ParameterOf(challenge, "opaque");
  const std::string uri = "/" + credentials.path;
  const std::string cnonce = ClientNonce(time);

  std::string chain =
      Md5Of(credentials.user + ":" + realm + ":" + credentials.password) + ":" + nonce;
  if (qop == "auth" || qop == "auth-int") chain += ":00000001:" + cnonce + ":" + qop;
  const std::string response = Md5Of(chain + ":" + DigestOfRequest(method, uri, qop));

  std::string line = "Authorization: Digest username=\"" + credentials.user;
  line += "\", realm=\"" + realm + "\", nonce=\"" + nonce + "\", uri=\"" + uri;
  line += "\", response=\"" + response + kQuote;
  if (!qop.empty()) line += ", qop=" + qop + ", nc=00000001, cnonce=\"" + cnonce + kQuote;
  if (!algorithm.empty()) line += ", algorithm=\"" + algorithm + kQuote;
  if (!opaque.empty()) line += ", opaque=\"" + opaque + kQuote;
  return line;
}

bool ModelContains(const std::string& text, const std::string& word) {
  if (text.empty()) return false;
  std::string low_text;
  std::string low_word;
  for (const char c : text) low_text += Lower(c);
  for (const char c : word) low_word += Lower(c);
  return low_text.find(low_word) != std::string::npos;
}
