// A daemon in small: it takes requests for a camera on its standard input, one per line, and answers
// each with one line on its standard output.
//
//   get HOST PORT PATH
//   login HOST PORT PATH USER PASSWORD
//   post HOST PORT PATH?FORM USER PASSWORD
//   https-get HOST PORT PATH
#include <json/json.h>

#include <iostream>
#include <sstream>
#include <string>

#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;  // seconds

struct Request {
  std::string action, host, path, user, password;
  int port = 0;
};

std::string Compact(const Json::Value& value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  return Json::writeString(builder, value);
}

// Sends nothing before it is asked: the client logs in with what the server's challenge wants.
void InitClient(const Request& request, TWHttpClient* client) {
  client->Init(request.path, request.host, request.port, request.user, request.password, kTimeout,
               /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false, HTTP_VERSION_1_0,
               /*encodeKeep=*/"", /*https=*/false);
}

std::string ReadBody(TWHttpClient* client) {
  std::string body;
  char piece[8192];
  for (int count; (count = client->ReadData(piece, sizeof(piece))) > 0;) {
    body.append(piece, static_cast<size_t>(count));
  }
  while (!body.empty() && body.back() == '\n') body.pop_back();
  return body;
}

std::string Get(const Request& request) {
  Json::Value response;
  const int result =
      SendHttpGet(request.host, request.port, request.path, response, kTimeout, false);
  return "SendHttpGet " + std::to_string(result) + " " + Compact(response);
}

std::string HttpsGet(const Request& request) {
  Json::Value response;
  const int result = SendHttpsGet(request.host, request.port, request.path, response, kTimeout);
  return "SendHttpsGet " + std::to_string(result) + " " + Compact(response);
}

std::string Login(const Request& request) {
  TWHttpClient client;
  InitClient(request, &client);
  std::ostringstream result;
  result << "SendRequest " << client.SendRequest(HTTP_METHOD_GET, "");
  int status = 0;
  const int outcome = client.CheckResponse(status);
  result << " CheckResponse " << outcome << " status " << status;
  if (outcome == HTTP_RET_OK) result << " " << ReadBody(&client);
  return result.str();
}

std::string Post(const Request& request) {
  TWHttpClient client;
  InitClient(request, &client);
  return "SendRequest " + std::to_string(client.SendRequest(HTTP_METHOD_POST, "?"));
}

std::string Serve(const Request& request) {
  if (request.action == "get") return Get(request);
  if (request.action == "login") return Login(request);
  if (request.action == "post") return Post(request);
  if (request.action == "https-get") return HttpsGet(request);
  return "unknown request: " + request.action;
}

}  // namespace

int main() {
  std::string line;
  while (std::getline(std::cin, line)) {
    Request request;
    std::istringstream words(line);
    words >> request.action >> request.host >> request.port >> request.path;
    words >> request.user >> request.password;
    std::cout << Serve(request) << std::endl;
  }
  return 0;
}
