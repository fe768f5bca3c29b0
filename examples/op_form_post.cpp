// Posts a form with a session's cookie and prints the response: SendRequestBySocketPost, then
// ReadBody.
//
//   op_form_post HOST PORT PATH FORM COOKIE
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;  // seconds, for connecting and for each wait

int Fail(const char* reason) {
  std::fprintf(stderr, "%s\n", reason);
  return 1;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 6) {
    std::fprintf(stderr, "usage: op_form_post HOST PORT PATH FORM COOKIE\n");
    return 2;
  }
  // After a form of HTTP/1.1 many servers keep the connection, and the end of the body is not seen.
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", kTimeout, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_0, /*encodeKeep=*/"");
  client.SetCookie(argv[5]);

  // The form is sent as it is: its values are encoded already.
  if (client.SendRequestBySocketPost(argv[4]) != HTTP_RET_OK) return Fail("no connection");
  int status = 0;
  if (client.CheckResponse(status) != HTTP_RET_OK) return Fail("the form was not taken");

  std::string body;
  if (client.ReadBody(body) != HTTP_RET_OK) return Fail("the response broke off");
  std::fwrite(body.data(), 1, body.size(), stdout);

  // The head of the response has replaced the cookie, with its own or with nothing.
  std::string cookie;
  client.GetCookie(cookie);
  if (!cookie.empty()) std::printf("new cookie: %s\n", cookie.c_str());
  return 0;
}
