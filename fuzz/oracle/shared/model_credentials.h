// Basic and Digest credentials, written once more in the plainest way.
#ifndef TARNWICK_FUZZ_ORACLE_SHARED_MODEL_CREDENTIALS_H_
#define TARNWICK_FUZZ_ORACLE_SHARED_MODEL_CREDENTIALS_H_

#include <string>

struct ModelCredentials {
  std::string user;
  std::string password;
  std::string path;  // without its leading "/"
};

std::string ModelBasicLine(const ModelCredentials& credentials);

// REQUIRES: time(2) shows `time` while the library makes its own line.
std::string ModelDigestLine(const ModelCredentials& credentials, const std::string& challenge,
                            const std::string& method, const std::string& body, long time);

bool ModelContains(const std::string& text, const std::string& word);

#endif  // TARNWICK_FUZZ_ORACLE_SHARED_MODEL_CREDENTIALS_H_
