// Posts an XML document to a device: SendReqByXMLPost, then GetResponseXML. Of a long document only
// the first 8,191 bytes are sent; SendReqByXMLPut has no such limit.
//
//   op_xml HOST PORT PATH USER PASSWORD
#include <libxml/tree.h>

#include <cstdio>
#include <cstdlib>

#include "tarnwick/http/twhttp.h"

namespace {

// <preset><pan>3</pan></preset>
xmlDoc* NewPreset() {
  xmlDoc* doc = xmlNewDoc(nullptr);
  xmlNode* root = xmlNewNode(nullptr, reinterpret_cast<const xmlChar*>("preset"));
  xmlDocSetRootElement(doc, root);
  xmlNewChild(root, nullptr, reinterpret_cast<const xmlChar*>("pan"),
              reinterpret_cast<const xmlChar*>("3"));
  return doc;
}

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
    std::fprintf(stderr, "usage: op_xml HOST PORT PATH USER PASSWORD\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[3], argv[4], argv[5], 5, false, true, false,
                      false, HTTP_VERSION_NONE, "");

  xmlDoc* preset = NewPreset();
  const int result = client.SendReqByXMLPost(preset);
  xmlFreeDoc(preset);  // the request only reads it
  if (result != HTTP_RET_OK) {
    std::fprintf(stderr, "the preset was not taken\n");
    return 1;
  }
  PrintAnswer(&client);
  return 0;
}
