// A client that gSOAP has generated: asks a camera for its model, and prints it or the fault.
//
//   gsoap_client URL [USER PASSWORD]       logs in by Digest when it is asked to
#include <cstdio>

#include "camera.nsmap"
#include "httpda.h"
#include "soapH.h"

int main(int count, char** argv) {
  struct soap* soap = soap_new();
  soap_set_namespaces(soap, namespaces);
  soap_register_plugin(soap, http_da);
  soap->recv_timeout = soap->send_timeout = 10;
  char* model = nullptr;
  int status = soap_call_GetDeviceInformation(soap, argv[1], nullptr, &model);
  http_da_info login = {};
  if (status == 401 && count > 3) {
    http_da_save(soap, &login, soap->authrealm, argv[2], argv[3]);
    status = soap_call_GetDeviceInformation(soap, argv[1], nullptr, &model);
    http_da_release(soap, &login);
  }
  if (status == SOAP_OK) printf("%s\n", model);
  if (status != SOAP_OK) soap_print_fault(soap, stdout);
  soap_destroy(soap);
  soap_end(soap);
  soap_free(soap);
}
