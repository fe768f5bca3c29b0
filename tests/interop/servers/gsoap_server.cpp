// gSOAP's stand-alone server as a camera: "/basic" and "/digest" want the operator's login. The
// second port logs in by Digest, the third sends chunks.
//
//   gsoap_server PORT DIGEST_PORT CHUNK_PORT
#include <cstdlib>
#include <cstring>
#include <thread>

#include "camera.nsmap"
#include "httpda.h"
#include "soapH.h"

namespace {

constexpr char kUser[] = "operator";
constexpr char kPassword[] = "gate-7";
constexpr char kRealm[] = "camera";

bool LoggedIn(struct soap* soap) {
  if (soap->userid == nullptr || strcmp(soap->userid, kUser) != 0) return false;
  if (soap->authrealm != nullptr) return http_da_verify_post(soap, kPassword) == SOAP_OK;
  return soap->passwd != nullptr && strcmp(soap->passwd, kPassword) == 0;
}

void Serve(const char* port, soap_mode mode, bool digest) {
  struct soap* soap = soap_new1(mode);
  soap_set_namespaces(soap, namespaces);
  if (digest) soap_register_plugin(soap, http_da);
  soap->bind_flags = SO_REUSEADDR;
  soap->socket_flags = MSG_NOSIGNAL;  // a client may leave before its response is written
  soap->recv_timeout = soap->send_timeout = 10;
  if (!soap_valid_socket(soap_bind(soap, "127.0.0.1", atoi(port), 16))) {
    soap_print_fault(soap, stderr);
    exit(1);
  }
  while (soap_valid_socket(soap_accept(soap))) {
    soap_serve(soap);
    soap_destroy(soap);
    soap_end(soap);
  }
}

}  // namespace

int ns__GetInfo(struct soap* soap, char* name, char** result) {
  const bool open =
      strstr(soap->path, "basic") == nullptr && strstr(soap->path, "digest") == nullptr;
  if (!open && !LoggedIn(soap)) {
    soap->authrealm = kRealm;
    return 401;
  }
  *result = soap_strdup(soap, name != nullptr ? name : "");
  return SOAP_OK;
}

// What twcamsim is asked; nobody asks this server.
int GetDeviceInformation(struct soap*, char**) {
  return SOAP_NO_METHOD;
}

int main(int, char** argv) {
  std::thread plain(Serve, argv[1], SOAP_IO_KEEPALIVE, false);
  std::thread digest(Serve, argv[2], SOAP_IO_KEEPALIVE, true);
  Serve(argv[3], SOAP_IO_CHUNK, false);
}
