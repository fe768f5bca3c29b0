// Exchanges XML documents with a REST device: SendReqByXMLGet, SendReqByXMLPost, SendReqByXMLPut or
// SendReqByXMLDelete, then GetResponseXML.
//
//   op_xml HOST PORT GET|POST|PUT|DELETE PATH USER PASSWORD
#include <libxml/tree.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

using Document = std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)>;

constexpr int kTimeout = 10;  // seconds, for the whole transfer of a GET; the others have no limit

// <preset><pan>3</pan></preset>
Document NewPreset() {
  Document doc(xmlNewDoc(nullptr), &xmlFreeDoc);
  xmlNode* root = xmlNewNode(nullptr, reinterpret_cast<const xmlChar*>("preset"));
  xmlDocSetRootElement(doc.get(), root);
  xmlNewChild(root, nullptr, reinterpret_cast<const xmlChar*>("pan"),
              reinterpret_cast<const xmlChar*>("3"));
  return doc;
}

int Send(TWHttpClient* client, const std::string& method) {
  if (method == "GET") return client->SendReqByXMLGet(kTimeout);
  if (method == "DELETE") return client->SendReqByXMLDelete();
  const Document preset = NewPreset();
  xmlDoc* body = preset.get();  // the request only reads it
  // Of a long document a POST sends only the first 8,191 bytes; a PUT has no such limit.
  return method == "POST" ? client->SendReqByXMLPost(body) : client->SendReqByXMLPut(body);
}

// Prints the root of the response, if it has a body.
void PrintResponse(TWHttpClient* client) {
  xmlDoc* parsed = nullptr;
  if (!client->GetResponseXML(parsed)) {
    std::puts("done");
    return;
  }
  const Document response(parsed, &xmlFreeDoc);
  const xmlNode* root = xmlDocGetRootElement(response.get());
  std::printf("response: %s\n", reinterpret_cast<const char*>(root->name));
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 7) {
    std::fprintf(stderr, "usage: op_xml HOST PORT GET|POST|PUT|DELETE PATH USER PASSWORD\n");
    return 2;
  }
  TWHttpClient client(argv[1], std::atoi(argv[2]), argv[4], argv[5], argv[6], kTimeout,
                      /*https=*/false, /*bufferedRead=*/true, /*encodeQuery=*/false,
                      /*basicAuth=*/false, HTTP_VERSION_NONE, /*encodeKeep=*/"");
  if (Send(&client, argv[3]) != HTTP_RET_OK) {
    std::fprintf(stderr, "the request failed\n");
    return 1;
  }
  PrintResponse(&client);
  return 0;
}
