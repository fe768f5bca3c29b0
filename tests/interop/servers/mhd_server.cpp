// GNU libmicrohttpd as a device: keeps connections, and knows Basic and Digest with MD5 and
// SHA-256.
//
//   mhd_server PORT
#include <microhttpd.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

constexpr char kUser[] = "operator";
constexpr char kPassword[] = "gate-7";
constexpr char kRealm[] = "camera";
constexpr char kOpaque[] = "c0ffee";

// The body of the request, of which the first call has nothing.
struct Request {
  std::string body;
};

MHD_Response* NewResponse(const std::string& text, const char* type) {
  MHD_Response* response = MHD_create_response_from_buffer(
      text.size(), const_cast<char*>(text.data()), MHD_RESPMEM_MUST_COPY);
  MHD_add_response_header(response, MHD_HTTP_HEADER_CONTENT_TYPE, type);
  return response;
}

MHD_Result Send(MHD_Connection* connection, unsigned int status, MHD_Response* response) {
  const MHD_Result result = MHD_queue_response(connection, status, response);
  MHD_destroy_response(response);
  return result;
}

// Ten lines, each a piece of its own, of a body whose length is not known.
ssize_t NextLine(void*, uint64_t at, char* buf, size_t) {
  if (at >= 80) return MHD_CONTENT_READER_END_OF_STREAM;
  memcpy(buf, "line xx\n", 8);
  return 8;
}

MHD_Response* NewStream() {
  return MHD_create_response_from_callback(MHD_SIZE_UNKNOWN, 64, NextLine, nullptr, nullptr);
}

bool BasicLogin(MHD_Connection* connection) {
  char* password = nullptr;
  char* user = MHD_basic_auth_get_username_password(connection, &password);
  const bool good = user != nullptr && password != nullptr && strcmp(user, kUser) == 0 &&
                    strcmp(password, kPassword) == 0;
  MHD_free(user);
  MHD_free(password);
  return good;
}

MHD_Result RefuseBasic(MHD_Connection* connection) {
  MHD_Response* response = NewResponse("refused\n", "text/plain");
  const MHD_Result result = MHD_queue_basic_auth_fail_response(connection, "camera", response);
  MHD_destroy_response(response);
  return result;
}

MHD_Result RefuseDigest(MHD_Connection* connection, MHD_DigestAuthAlgorithm algorithm, int check) {
  MHD_Response* response = NewResponse("refused\n", "text/plain");
  const MHD_Result result =
      MHD_queue_auth_fail_response2(connection, kRealm, kOpaque, response,
                                    check == MHD_INVALID_NONCE ? MHD_YES : MHD_NO, algorithm);
  MHD_destroy_response(response);
  return result;
}

int DigestLogin(MHD_Connection* connection, MHD_DigestAuthAlgorithm algorithm) {
  return MHD_digest_auth_check2(connection, kRealm, kUser, kPassword, 300, algorithm);
}

MHD_Result Serve(MHD_Connection* connection, const std::string& path, const char* method,
                 const std::string& body) {
  const std::string told = std::string(method) + " " + body;
  if (path.find("stream") != std::string::npos) {
    return Send(connection, MHD_HTTP_OK, NewStream());
  }
  if (path.find("xml") != std::string::npos) {
    const std::string text = "<response method=\"" + std::string(method) + "\"/>";
    return Send(connection, MHD_HTTP_OK, NewResponse(text, "application/xml"));
  }
  if (path.find("json") != std::string::npos) {
    const std::string text = R"({"success":true,"told":")" + told + "\"}";
    return Send(connection, MHD_HTTP_OK, NewResponse(text, "application/json"));
  }
  return Send(connection, MHD_HTTP_OK, NewResponse(told, "text/plain"));
}

MHD_Result Handle(void*, MHD_Connection* connection, const char* url, const char* method,
                  const char*, const char* data, size_t* size, void** state) {
  if (*state == nullptr) {
    *state = new Request;
    return MHD_YES;
  }
  Request* request = static_cast<Request*>(*state);
  if (*size > 0) {
    request->body.append(data, *size);
    *size = 0;
    return MHD_YES;
  }
  const std::string path = url;
  if (path.rfind("/basic/", 0) == 0 && !BasicLogin(connection)) return RefuseBasic(connection);
  const bool sha256 = path.rfind("/sha256/", 0) == 0;
  if (sha256 || path.rfind("/md5/", 0) == 0) {
    const MHD_DigestAuthAlgorithm algorithm = sha256 ? MHD_DIGEST_ALG_SHA256 : MHD_DIGEST_ALG_MD5;
    const int check = DigestLogin(connection, algorithm);
    if (check != MHD_YES) return RefuseDigest(connection, algorithm, check);
  }
  return Serve(connection, path, method, request->body);
}

void Forget(void*, MHD_Connection*, void** state, MHD_RequestTerminationCode) {
  delete static_cast<Request*>(*state);
  *state = nullptr;
}

}  // namespace

int main(int, char** argv) {
  const char seed[] = "8 bytes";
  MHD_Daemon* daemon =
      MHD_start_daemon(MHD_USE_INTERNAL_POLLING_THREAD | MHD_USE_ERROR_LOG,
                       static_cast<uint16_t>(atoi(argv[1])), nullptr, nullptr, &Handle, nullptr,
                       MHD_OPTION_NOTIFY_COMPLETED, &Forget, nullptr, MHD_OPTION_DIGEST_AUTH_RANDOM,
                       sizeof(seed), seed, MHD_OPTION_NONCE_NC_SIZE, 300u, MHD_OPTION_END);
  if (daemon == nullptr) return 1;
  for (;;) pause();
}
