// Posts a SOAP envelope and looks into the response: SendReqByXMLSocketPost.
//
//   op_soap_xml HOST PORT PATH
#include <libxml/tree.h>

#include <cstdio>
#include <cstdlib>
#include <memory>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;  // seconds, for connecting and for each wait

constexpr char kEnvelope[] =
    "<s:Envelope xmlns:s=\"http://www.w3.org/2003/05/soap-envelope\">"
    "<s:Body><GetPresets/></s:Body></s:Envelope>";

// The document belongs to the caller.
struct DocDeleter {
  void operator()(xmlDoc* doc) const { xmlFreeDoc(doc); }
};

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: op_soap_xml HOST PORT PATH\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], "", "", kTimeout, /*https=*/false,
                      /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
                      HTTP_VERSION_1_1, /*encodeKeep=*/"");

  xmlDoc* response = nullptr;
  if (client.SendReqByXMLSocketPost(kEnvelope, response) != HTTP_RET_OK) {
    std::fprintf(stderr, "no response\n");
    return 1;
  }
  const std::unique_ptr<xmlDoc, DocDeleter> owner(response);
  const xmlNode* root = xmlDocGetRootElement(response);
  if (root == nullptr) {
    std::fprintf(stderr, "the response is no XML\n");
    return 1;
  }
  std::printf("root: %s\n", reinterpret_cast<const char*>(root->name));
  int status = 0;
  return client.CheckResponse(status) == HTTP_RET_OK ? 0 : 1;
}
