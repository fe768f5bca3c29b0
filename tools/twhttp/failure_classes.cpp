// The table of the failure classes.
#include <algorithm>
#include <cstdio>

#include "tools/twhttp/failure.h"

namespace {

constexpr char kVerbose[] = "twhttp {operation} -v --timings {url}";

const std::vector<ClassFacts>& Table() {
  using Id = FailureClass;
  static const std::vector<ClassFacts> table = {
      {Id::kNone, 0, "done", "The request succeeded.", {}, ""},
      {Id::kOther, 1, "other", "It failed in a way that has no class.", {}, kVerbose},
      {Id::kLocalFile,
       3,
       "local-file",
       "A file on this side, or standard output, could not be read or written.",
       {"the file does not exist or may not be read or written", "the disk is full"},
       "ls -l"},
      {Id::kLookUp,
       10,
       "look-up",
       "The host's name has no IPv4 address.",
       {"the name is misspelt", "the name server does not know it or does not answer",
        "the host has IPv6 addresses alone"},
       "getent ahostsv4 {host}"},
      {Id::kRefused,
       11,
       "refused",
       "The host refuses connections to this port.",
       {"nothing listens there: another port, or the service is down",
        "a firewall rejects the connection"},
       "twhttp {operation} -v http://{host}:80/"},
      {Id::kUnreachable,
       12,
       "unreachable",
       "No way leads to the host.",
       {"this machine has no route to that network", "the host is off and its neighbour says so",
        "the source address belongs to another interface"},
       "ip route get {host}"},
      {Id::kConnectTimeout,
       13,
       "connect-timeout",
       "Nobody answered the connection attempt.",
       {"the host is off or its address is another one", "a firewall drops the packets",
        "the host is overloaded, and its queue of connections is full"},
       "ping -c 3 {host}"},
      {Id::kReset,
       14,
       "reset",
       "The peer broke the connection off with a reset.",
       {"the service crashed or was restarted", "the device closes with unread bytes before it",
        "a device on the way ends connections"},
       "twhttp {operation} --repeat 5 --interval 1s {url}"},
      {Id::kNoReply,
       15,
       "no-reply",
       "The peer closed the connection without a word.",
       {"the port speaks TLS and the request did not, or the other way round",
        "the device allows a few connections alone", "the request was not to its liking"},
       kVerbose},
      {Id::kWriteFailed,
       16,
       "write-failed",
       "The request could not be written in full.",
       {"the peer closed before it had read everything", "the peer refuses bodies of that size"},
       kVerbose},
      {Id::kReadTimeout,
       20,
       "read-timeout",
       "The peer stopped sending before it was done.",
       {"the device is busy", "the request waits for something at the device",
        "packets are lost on the way"},
       "twhttp {operation} --timings --timeout 30 {url}"},
      {Id::kKeptOpen,
       21,
       "kept-open",
       "The reply came in full, but the peer did not close behind it, and the library waits for "
       "the close.",
       {"the peer keeps connections of HTTP/1.1 open", "the peer ignores what HTTP/1.0 means"},
       "twhttp curl-get -v {url}"},
      {Id::kGaveUp,
       22,
       "gave-up",
       "Nothing happened for so long that the tool ended a wait without a limit of its own.",
       {"the port does not speak TLS, or stalls in it", "the peer takes nothing more",
        "the operation has no time limit, and the device is slow"},
       kVerbose},
      {Id::kTls,
       30,
       "tls",
       "The TLS handshake failed.",
       {"the port speaks plain HTTP", "the two sides share no protocol version or cipher",
        "the peer closes such connections"},
       "openssl s_client -connect {host}:{port} -showcerts"},
      {Id::kCertificate,
       31,
       "certificate",
       "The server's certificate cannot be verified.",
       {"the certificate is of the device's own making", "it has expired, or the clock is wrong",
        "it is made out to another name"},
       "openssl s_client -connect {host}:{port} -servername {host} -showcerts"},
      {Id::kMalformedHead,
       40,
       "malformed-head",
       "The head of the reply cannot be read.",
       {"the port speaks another protocol", "the device's server is faulty"},
       kVerbose},
      {Id::kCutBody,
       41,
       "cut-body",
       "The body ended before it was complete.",
       {"the service ended while it was sending", "the device announces a wrong length",
        "a device on the way ends connections"},
       "twhttp {operation} --repeat 5 --interval 1s {url}"},
      {Id::kNoLength,
       42,
       "no-length",
       "The reply has no usable Content-Length, without which the library reads no SOAP reply.",
       {"the service answers in chunks", "the service tells the end by closing",
        "the body is empty"},
       "twhttp form -v --data-file ENVELOPE {url}"},
      {Id::kLoginRefused,
       50,
       "login-refused",
       "The peer was given a login and refused it.",
       {"user or password is wrong", "the account is locked after too many attempts",
        "the device checks a part of the login in another way than the library writes it"},
       kVerbose},
      {Id::kLoginWanted,
       51,
       "login-wanted",
       "The peer wants a login and was given none.",
       {"the target has no user:password@", "the operation sends no login",
        "the peer offers no scheme that the library knows"},
       "twhttp get -v {url}"},
      {Id::kStatus,
       52,
       "status",
       "The peer answered with a status that is no success.",
       {"the path or a parameter is wrong", "the device does not support the request"},
       kVerbose},
      {Id::kXml,
       60,
       "xml",
       "The reply is no well-formed XML.",
       {"the peer answered with a page for people", "the reply is cut or in another encoding"},
       "twhttp get -v {url}"},
      {Id::kJson,
       61,
       "json",
       "The reply is no JSON.",
       {"the peer answered with a page for people", "the reply is cut"},
       "twhttp get -v {url}"},
      {Id::kNotSuccess,
       62,
       "not-success",
       "The reply is JSON whose member \"success\" is missing or not true.",
       {"the service refused the request; the reply tells why", "the path is another service's"},
       "twhttp get {url}"},
      {Id::kEmptyBody,
       63,
       "empty-body",
       "The reply has no body, and the operation wants one.",
       {"the path is another service's", "the service failed without telling"},
       "twhttp get -v {url}"},
      {Id::kInterrupted, 130, "interrupted", "The operation was interrupted.", {}, ""},
  };
  return table;
}

}  // namespace

const ClassFacts& FactsOf(FailureClass id) {
  const auto found = std::find_if(Table().begin(), Table().end(),
                                  [&](const ClassFacts& facts) { return facts.id == id; });
  return *found;
}

std::string ExitCodeTable() {
  std::string text;
  const auto add = [&](int code, const char* name, const char* meaning) {
    char line[256];
    snprintf(line, sizeof(line), "%3d  %-16s %s\n", code, name, meaning);
    text += line;
  };
  for (const ClassFacts& facts : Table()) {
    if (facts.exit_code == 3) add(2, "usage", "The command line is wrong.");
    add(facts.exit_code, facts.name, facts.meaning);
  }
  return text;
}
