#include "tools/twhttp/as_curl.h"

#include <arpa/inet.h>

#include <algorithm>

#include "tarnwick/http/query_encoding.h"
#include "tools/common/shell.h"

namespace {

constexpr char kAgent[] = "Quenrith Tarnwick";

class CurlCommand {
 public:
  explicit CurlCommand(const Options& options) : options_(options) {
    Add({"curl", "--silent", "--show-error", "--globoff"});
  }

  void Add(const std::vector<std::string>& words) {
    for (const std::string& word : words) text_ += (text_.empty() ? "" : " ") + QuoteForShell(word);
  }
  void Header(const std::string& line) { Add({"--header", line}); }

  void Credentials(const char* scheme) {
    const Target& target = options_.target;
    const std::string password = options_.show_secrets ? target.password : "***";
    Add({scheme, "--user", target.user + ":" + (target.password.empty() ? "" : password)});
  }
  void CredentialsIfGiven(const char* scheme) {
    if (options_.target.has_credentials) Credentials(scheme);
  }
  void Cookie() {
    if (options_.cookie.empty()) return;
    Header("Cookie: " + (options_.show_secrets ? options_.cookie : "***"));
  }
  void Body(const char* option) {
    Add({option, options_.body_file.empty() ? options_.body : "@" + options_.body_file});
  }
  void TotalTimeout() {
    if (options_.timeout > 0) Add({"--max-time", std::to_string(options_.timeout)});
  }
  void Socket();
  void SocketHeaders(bool host);
  void ByCurl();
  std::string Finish(const std::string& path);

 private:
  const Options& options_;
  std::string text_;
};

// What the client's socket does: no verification, a limit for connecting, a source address.
void CurlCommand::Socket() {
  if (options_.timeout > 0) Add({"--connect-timeout", std::to_string(options_.timeout)});
  if (options_.target.https) Add({"--insecure"});
  if (options_.source == 0) return;
  char address[INET_ADDRSTRLEN] = "";
  inet_ntop(AF_INET, &options_.source, address, sizeof(address));
  Add({"--interface", address});
}

// The socket's requests name the host without its port, or not at all, and accept nothing.
void CurlCommand::SocketHeaders(bool host) {
  Header("Accept:");
  Header(host ? "Host: " + options_.target.host : "Host:");
}

void CurlCommand::ByCurl() {
  Add({"--user-agent", kAgent});
  Header("Content-Type: application/x-www-form-urlencoded; charset=utf-8");
  Header("Connection: close");
  Cookie();
  Credentials("--basic");
  if (!options_.verify_peer) Add({"--insecure"});
  TotalTimeout();
  if (!options_.response_file.empty()) {
    Add({"--include", "--output", options_.response_file});
  }
}

std::string CurlCommand::Finish(const std::string& path) {
  const Target& target = options_.target;
  Add({(target.https ? "https://" : "http://") + target.HostAndPort() + "/" + path});
  return text_;
}

std::string Get(const Options& options) {
  CurlCommand command(options);
  const bool one_call = options.operation->id == OperationId::kJsonGet;
  const bool http11 = options.version == HTTP_VERSION_1_1;
  command.Add({http11 ? "--http1.1" : "--http1.0", "--user-agent", kAgent});
  command.SocketHeaders(http11);
  command.Cookie();
  if (one_call || options.basic_first) {
    command.Credentials("--basic");
  } else {
    command.CredentialsIfGiven("--anyauth");
  }
  command.Socket();
  return command.Finish(options.encode_query
                            ? tarnwick::EncodeQueryValues(options.target.path, options.encode_keep)
                            : options.target.path);
}

std::string Form(const Options& options) {
  CurlCommand command(options);
  const bool http10 = options.version == HTTP_VERSION_1_0;
  command.Add({http10 ? "--http1.0" : "--http1.1"});
  command.Header("User-Agent:");
  command.SocketHeaders(true);
  command.Cookie();
  command.Header("Content-Type: application/x-www-form-urlencoded; charset=utf-8");
  if (!http10) command.Header("Connection: close;");
  command.Body("--data-binary");
  command.Socket();
  return command.Finish(options.target.path);
}

std::string Soap(const Options& options) {
  CurlCommand command(options);
  command.Add({"--http1.1"});
  command.Header("User-Agent:");
  command.SocketHeaders(true);
  command.Header("Content-Type: application/soap+xml; charset=utf-8");
  if (options.operation->id == OperationId::kSoapAuth) command.CredentialsIfGiven("--anyauth");
  command.Body("--data-binary");
  command.Socket();
  return command.Finish(options.target.path);
}

std::string Upload(const Options& options) {
  CurlCommand command(options);
  command.Add({"--http1.1"});
  command.Cookie();
  command.Add({"--form",
               options.body_file.empty() ? "file=" + options.body : "file=@" + options.body_file});
  command.Socket();
  return command.Finish(options.target.path);
}

std::string ByCurl(const Options& options) {
  CurlCommand command(options);
  command.ByCurl();
  if (options.operation->id != OperationId::kCurlPost) return command.Finish(options.target.path);
  command.Add({"--data-binary", options.target.path});
  return command.Finish("");
}

std::string CurlForm(const Options& options) {
  CurlCommand command(options);
  const std::string& path = options.target.path;
  const size_t separator = std::min(path.find_first_of(options.separators), path.size());
  if (options.version != HTTP_VERSION_NONE) {
    command.Add({options.version == HTTP_VERSION_1_0 ? "--http1.0" : "--http1.1"});
  }
  command.Header("User-Agent:");
  command.CredentialsIfGiven("--anyauth");
  command.Add({"--data-binary", path.substr(std::min(separator + 1, path.size()))});
  return command.Finish(path.substr(0, separator));
}

std::string Xml(const Options& options) {
  CurlCommand command(options);
  const OperationId id = options.operation->id;
  command.Header("User-Agent:");
  command.CredentialsIfGiven(id == OperationId::kXmlGet ? "--anyauth" : "--basic");
  if (id == OperationId::kXmlGet) command.TotalTimeout();
  if (id == OperationId::kXmlDelete) command.Add({"--request", "DELETE"});
  if (id == OperationId::kXmlPut) command.Add({"--request", "PUT"});
  if (options.operation->Uses(kBody)) {
    command.Header("Content-Type: application/xml; charset=UTF-8");
    command.Body("--data-binary");
  }
  return command.Finish(options.target.path);
}

std::string RawResp(const Options& options) {
  CurlCommand command(options);
  command.Add({"--http1.0"});
  command.Header("User-Agent:");
  command.SocketHeaders(true);
  command.Header("Connection: close");
  command.Socket();
  return command.Finish(options.target.path);
}

}  // namespace

std::string AsCurl(const Options& options) {
  switch (options.operation->id) {
    case OperationId::kGet:
    case OperationId::kJsonGet:
      return Get(options);
    case OperationId::kForm:
    case OperationId::kJsonPost:
      return Form(options);
    case OperationId::kSoap:
    case OperationId::kSoapAuth:
    case OperationId::kSoapXml:
      return Soap(options);
    case OperationId::kUpload:
      return Upload(options);
    case OperationId::kCurlGet:
    case OperationId::kCurlPost:
    case OperationId::kJsonGets:
      return ByCurl(options);
    case OperationId::kCurlForm:
      return CurlForm(options);
    case OperationId::kRawResp:
      return RawResp(options);
    default:
      return Xml(options);
  }
}
