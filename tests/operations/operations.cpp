#include "tests/operations/operations.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>

#include "tests/operations/parts.h"

const std::vector<PeerOperation>& PeerOperations() {
  constexpr auto kEither = OverTls::kEither;
  constexpr auto kNever = OverTls::kNever;
  static const std::vector<int> kIo = {HTTP_RET_IO_ERROR};
  static const std::vector<int> kTransfer = {HTTP_RET_IO_ERROR, HTTP_RET_CERT_ERROR};
  static const std::vector<int> kLastResponse = {HTTP_RET_NOT_READY,    HTTP_RET_IO_ERROR,
                                                 HTTP_RET_UNAUTHORIZED, HTTP_RET_BAD_RESPONSE,
                                                 HTTP_RET_REDIRECT,     HTTP_RET_URI_TOO_LONG};
  static const std::vector<PeerOperation> operations = {
      // Over the client's socket.
      {"get_body", GetBody, kIo},
      {"get_data", GetData, kIo},
      {"get_lines", GetLines, kIo},
      {"get_twice", GetTwice, kIo},
      {"get_head_again", GetHeadAgain, kIo},
      {"login_get", LoginGet, kIo},
      {"form_post", FormPost, kIo},
      {"soap", Soap, kIo},
      {"soap_login", SoapLogin, kLastResponse},
      {"soap_xml", SoapXml, kIo},
      {"upload", Upload, kIo},
      {"second_request", SecondRequest, kIo},
      {"json_get", JsonGet, {-1, -2}, kNever},
      {"json_post", JsonPost, {-1}, kNever},
      // Through libcurl.
      {"json_get_tls", JsonGetOverTls, {-1, -2, -3}, OverTls::kAlways, true},
      {"curl_get", CurlGet, kTransfer, kEither, true},
      {"curl_get_file", CurlGetToFile, kTransfer, kEither, true},
      {"curl_post", CurlPost, kTransfer, kEither, true},
      {"curl_post_file", CurlPostToFile, kTransfer, kEither, true},
      {"curl_form", CurlForm, kIo, kNever, true},
      {"curl_login_form", CurlLoginForm, kIo, kNever, true},
      {"xml_get", XmlGet, kIo, kNever, true},
      {"xml_post", XmlPost, kIo, kNever, true},
      {"xml_put", XmlPut, kIo, kNever, true},
      {"xml_delete", XmlDelete, kIo, kNever, true},
      {"curl_handle", CurlHandle, {1}, kEither, true},
      // By the sockets alone.
      {"connect", Connect, {-1}},
      {"reconnect", Reconnect, {-1}},
      {"keep_alive", KeepAlive, {-1}},
      {"probe", Probe, {-1}},
      {"socket_exchange", SocketExchange, {-1}},
      {"socket_data", SocketData, {-1}},
      {"socket_lines", SocketLines, {-1}},
      {"socket_raw", SocketRaw, {-1}},
  };
  return operations;
}

const PeerOperation& OperationNamed(const std::string& name) {
  for (const PeerOperation& operation : PeerOperations()) {
    if (name == operation.name) return operation;
  }
  fprintf(stderr, "tests/operations has no %s\n", name.c_str());
  abort();
}

std::string Unmatched(const std::vector<std::string>& listed,
                      const std::vector<std::string>& left_out) {
  std::vector<std::string> names = listed;
  names.insert(names.end(), left_out.begin(), left_out.end());
  std::vector<std::string> known;
  for (const PeerOperation& operation : PeerOperations()) known.emplace_back(operation.name);
  std::sort(names.begin(), names.end());
  std::sort(known.begin(), known.end());
  names.erase(std::unique(names.begin(), names.end()), names.end());
  std::vector<std::string> odd;
  std::set_symmetric_difference(names.begin(), names.end(), known.begin(), known.end(),
                                std::back_inserter(odd));
  std::string text;
  for (const std::string& name : odd) text += " " + name;
  return text;
}
