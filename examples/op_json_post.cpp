// Posts a form to a service in one call: SendHttpPost. Whether the service took it is not known
// afterwards; SendRequestBySocketPost is for callers who need the response.
//
//   op_json_post HOST PORT PATH NAME VALUE
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"
#include "tarnwick/utils/utils.h"

namespace {

constexpr int kTimeout = 5;  // seconds, for connecting and for each wait

// Only the value: a name with characters to encode is not known to any service.
std::string Field(const std::string& name, const std::string& value) {
  return name + "=" + UrlEncode(value, "");
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 6) {
    std::fprintf(stderr, "usage: op_json_post HOST PORT PATH NAME VALUE\n");
    return 2;
  }
  const std::string form = Field(argv[4], argv[5]);
  if (SendHttpPost(argv[1], std::atoi(argv[2]), argv[3], form, "session=42", kTimeout) != 0) {
    std::fprintf(stderr, "the form was not sent\n");
    return 1;
  }
  std::printf("sent: %s\n", form.c_str());
  return 0;
}
