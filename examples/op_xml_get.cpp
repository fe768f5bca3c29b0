// Asks a device for an XML document: SendReqByXMLGet, then GetResponseXML.
//
//   op_xml_get HOST PORT PATH USER PASSWORD
#include <libxml/tree.h>

#include <cstdio>
#include <cstdlib>

#include "tarnwick/http/twhttp.h"

namespace {

// Prints the root of the answer, if it has a body.
void PrintAnswer(TWHttpClient* client) {
  xmlDoc* answer = nullptr;
  if (!client->GetResponseXML(answer)) {
    std::puts("done");
    return;
  }
  std::printf("answer: %s\n", reinterpret_cast<const char*>(xmlDocGetRootElement(answer)->name));
  xmlFreeDoc(answer);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 6) {
    std::fprintf(stderr, "usage: op_xml_get HOST PORT PATH USER PASSWORD\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], argv[4], argv[5], 5, false, true, false,
                      false, HTTP_VERSION_NONE, "");

  const int result = client.SendReqByXMLGet(10);  // seconds, for the whole transfer
  if (result != HTTP_RET_OK) {
    std::fprintf(stderr, "no document\n");
    return 1;
  }
  PrintAnswer(&client);
  return 0;
}
