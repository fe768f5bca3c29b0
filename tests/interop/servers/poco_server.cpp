// Poco's HTTP server as a service: one port keeps connections, the other does not. Its streams go
// out in chunks, whatever version the request has.
//
//   poco_server KEEP_PORT PORT
#include <Poco/Net/HTTPRequestHandler.h>
#include <Poco/Net/HTTPRequestHandlerFactory.h>
#include <Poco/Net/HTTPServer.h>
#include <Poco/Net/HTTPServerParams.h>
#include <Poco/Net/HTTPServerRequest.h>
#include <Poco/Net/HTTPServerResponse.h>
#include <Poco/StreamCopier.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

namespace {

using Poco::Net::HTTPRequestHandler;
using Poco::Net::HTTPServerRequest;
using Poco::Net::HTTPServerResponse;

void Send(HTTPServerResponse& response, const std::string& text, const char* type) {
  response.setContentType(type);
  response.setContentLength64(static_cast<Poco::Int64>(text.size()));
  response.send() << text;
}

void SendStream(HTTPServerResponse& response) {
  response.setChunkedTransferEncoding(true);
  response.setContentType("application/json");
  std::ostream& out = response.send();
  out << R"({"success":)" << std::flush << "true}";
}

class Handler : public HTTPRequestHandler {
 public:
  void handleRequest(HTTPServerRequest& request, HTTPServerResponse& response) override {
    const std::string path = request.getURI();
    if (path == "/upload") return TakeUpload(request, response);
    std::string body;
    Poco::StreamCopier::copyToString(request.stream(), body);
    if (path == "/moved") return response.redirect("/json");
    if (path == "/stream") return SendStream(response);
    if (path == "/xml") {
      const std::string text = "<response method=\"" + request.getMethod() + "\"/>";
      return Send(response, text, "application/xml");
    }
    const std::string told = request.getMethod() + " " + body;
    if (path == "/text") return Send(response, told, "text/plain");
    Send(response, R"({"success":true,"told":")" + told + "\"}", "application/json");
  }

 private:
  // Responds after the first 8 bytes; the length that the head announces never comes.
  static void TakeUpload(HTTPServerRequest& request, HTTPServerResponse& response) {
    char first[8];
    request.stream().read(first, sizeof(first));
    Send(response, R"({"success":true})", "application/json");
  }
};

class Factory : public Poco::Net::HTTPRequestHandlerFactory {
 public:
  HTTPRequestHandler* createRequestHandler(const HTTPServerRequest&) override {
    return new Handler;
  }
};

Poco::Net::HTTPServer* NewServer(const char* port, bool keep) {
  Poco::Net::HTTPServerParams::Ptr params = new Poco::Net::HTTPServerParams;
  params->setKeepAlive(keep);
  const Poco::Net::SocketAddress address("127.0.0.1", static_cast<Poco::UInt16>(atoi(port)));
  auto* server = new Poco::Net::HTTPServer(new Factory, Poco::Net::ServerSocket(address), params);
  server->start();
  return server;
}

}  // namespace

int main(int, char** argv) {
  NewServer(argv[1], true);
  NewServer(argv[2], false);
  for (;;) pause();
}
