// Finding the scheme words of an authentication challenge.
#ifndef TARNWICK_HTTP_CHALLENGE_WORDS_H_
#define TARNWICK_HTTP_CHALLENGE_WORDS_H_

#include <algorithm>
#include <cctype>
#include <string>

namespace tarnwick {

inline bool CharEqualsIgnoreCase(char a, char b) {
  return std::tolower(static_cast<unsigned char>(a)) == std::tolower(static_cast<unsigned char>(b));
}

// True when `word` occurs anywhere in `text`, ignoring case. An empty text contains nothing, not
// even an empty word.
inline bool ContainsIgnoreCase(const std::string& text, const std::string& word) {
  return std::search(text.begin(), text.end(), word.begin(), word.end(), CharEqualsIgnoreCase) !=
         text.end();
}

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_CHALLENGE_WORDS_H_
