#include "tools/twcamsim/digest_check.h"

#include <openssl/evp.h>

#include <cctype>
#include <utility>
#include <vector>

namespace {

constexpr char kBlanks[] = " \t";

void SkipBlanks(const std::string& text, size_t* at) {
  *at = text.find_first_not_of(" \t,", *at);
  if (*at == std::string::npos) *at = text.size();
}

// Reads the value at `*at` and leaves `*at` after it.
bool ReadWord(const std::string& text, size_t* at, DigestWord* word) {
  if (*at < text.size() && text[*at] == '"') {
    const size_t end = text.find('"', *at + 1);
    if (end == std::string::npos) return false;
    *word = {text.substr(*at + 1, end - *at - 1), true};
    *at = end + 1;
    return true;
  }
  const size_t end = std::min(text.find(',', *at), text.size());
  word->value = text.substr(*at, end - *at);
  word->value.erase(word->value.find_last_not_of(kBlanks) + 1);
  *at = end;
  return true;
}

std::string Ha2(const DigestInput& input) {
  std::string text = input.method + ":" + input.uri;
  if (input.qop == "auth-int") text += ":" + Md5Hex(input.body);
  return Md5Hex(text);
}

std::string Respond(const DigestInput& input, const std::string& ha2) {
  std::string ha1 = Md5Hex(input.user + ":" + input.realm + ":" + input.password);
  if (input.session) ha1 = Md5Hex(ha1 + ":" + input.nonce + ":" + input.cnonce);
  std::string text = ha1 + ":" + input.nonce;
  if (input.qop == "auth" || input.qop == "auth-int") {
    text += ":" + input.count + ":" + input.cnonce + ":" + input.qop;
  }
  return Md5Hex(text + ":" + ha2);
}

using Change = std::pair<const char*, DigestInput>;

std::vector<Change> KnownMistakes(const DigestInput& input) {
  std::vector<Change> changes;
  const auto add = [&](const char* text, auto change) {
    changes.emplace_back(text, input);
    change(&changes.back().second);
  };
  add("computed without qop", [](DigestInput* changed) { changed->qop.clear(); });
  add("computed with qop auth", [](DigestInput* changed) { changed->qop = "auth"; });
  add("computed for an empty body", [](DigestInput* changed) { changed->body.clear(); });
  add("computed for an empty password", [](DigestInput* changed) { changed->password.clear(); });
  add("computed as plain MD5, not MD5-sess",
      [](DigestInput* changed) { changed->session = false; });
  add("computed as MD5-sess, not plain MD5", [](DigestInput* changed) { changed->session = true; });
  add("computed for the path without the query", [](DigestInput* changed) {
    changed->uri.erase(std::min(changed->uri.find('?'), changed->uri.size()));
  });
  for (const char* method : {"GET", "POST", "PUT", "DELETE"}) {
    add(method, [method](DigestInput* changed) { changed->method = method; });
  }
  return changes;
}

bool MustBeQuoted(const std::string& name) {
  return name == "username" || name == "realm" || name == "nonce" || name == "uri" ||
         name == "response" || name == "cnonce" || name == "opaque";
}

}  // namespace

bool ParseDigestWords(const std::string& text, DigestWords* words) {
  size_t at = 0;
  for (SkipBlanks(text, &at); at < text.size(); SkipBlanks(text, &at)) {
    const size_t equals = text.find('=', at);
    if (equals == std::string::npos) return false;
    std::string name = LowerCase(text.substr(at, equals - at));
    name.erase(name.find_last_not_of(kBlanks) + 1);
    at = std::min(text.find_first_not_of(kBlanks, equals + 1), text.size());
    DigestWord word;
    if (name.empty() || !ReadWord(text, &at, &word)) return false;
    words->emplace(name, word);
  }
  return true;
}

std::string Md5Hex(const std::string& text) {
  static constexpr char kDigits[] = "0123456789abcdef";
  unsigned char digest[EVP_MAX_MD_SIZE];
  unsigned int size = 0;
  EVP_Digest(text.data(), text.size(), digest, &size, EVP_md5(), nullptr);
  std::string hex;
  for (unsigned int i = 0; i < size; ++i) {
    hex += kDigits[digest[i] >> 4];
    hex += kDigits[digest[i] & 0xf];
  }
  return hex;
}

std::string DigestResponse(const DigestInput& input) {
  return Respond(input, Ha2(input));
}

std::string ExplainDigest(const DigestInput& input, const std::string& given) {
  for (const auto& [text, changed] : KnownMistakes(input)) {
    if (DigestResponse(changed) != given) continue;
    if (changed.method != input.method) return std::string("computed for the method ") + text;
    return text;
  }
  return "";
}

std::string WrongQuotes(const DigestWords& words) {
  for (const auto& [name, word] : words) {
    if (word.quoted != MustBeQuoted(name)) return name;
  }
  return "";
}
