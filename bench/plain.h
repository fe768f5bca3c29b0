// The floors of what is parsed and encoded in memory: one plain pass each, with no system call.
#ifndef TARNWICK_BENCH_PLAIN_H_
#define TARNWICK_BENCH_PLAIN_H_

#include <map>
#include <string>
#include <string_view>

// Parses a head with memchr for line feeds and colons. It keeps what the library keeps.
class HeadParser {
 public:
  void Parse(const std::string& head);

  // Whether that was HeadOf30Lines.
  bool IsRight() const { return m_status == 200 && m_kept.size() == 3 && !m_challenge.empty(); }

 private:
  void KeepLine(std::string_view line);

  std::map<int, std::string> m_kept;
  std::string m_cookie, m_challenge;
  int m_status = 0;
};

// Each line found by memchr and copied out, up to 2,047 bytes of it.
void CopyLines(const std::string& text);

// Each chunk copied once, to the end of the body.
std::string Dechunked(const std::string& bytes);

// What stands between two of them moved at once.
void RemovePlainly(std::string* text, char c);

// The text percent-encoded with a table: what all encoders must come to. The text goes by value, as
// the library's interface has it.
std::string UrlEncoded(std::string text);

// OpenSSL's base64 into a buffer from malloc, which the caller frees.
char* Base64ByOpenssl(const char* text);

#endif  // TARNWICK_BENCH_PLAIN_H_
