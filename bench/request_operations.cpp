// Whole requests over loopback: the client's side of them, with a connection each.
#include <fcntl.h>
#include <json/reader.h>
#include <libxml/parser.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "bench/operations.h"
#include "bench/peer.h"
#include "bench/texts.h"
#include "tarnwick/http/twhttp.h"

namespace {

constexpr char kHost[] = "127.0.0.1";

std::string Reply(const std::string& status, const std::string& headers, const std::string& body) {
  return "HTTP/1.1 " + status + "\r\nServer: camera\r\n" + headers +
         "Content-Length: " + std::to_string(body.size()) + "\r\nConnection: close\r\n\r\n" + body;
}

std::string JsonReply() {
  return Reply("200 OK", "Content-Type: application/json\r\n", kJsonText);
}

class JsonGet : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      Json::Value result;
      if (SendHttpGet(kHost, m_peer.Port(), "api/info?full=1", result, 5, false) != 0) std::abort();
    }
  }

 private:
  Peer m_peer{{JsonReply()}};
};

// The system calls that the design asks for, and nothing else but parsing what came.
class RequiredGet : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) Get();
  }

 private:
  void Get() const {
    const int fd = Connect();
    static constexpr char kRequest[] =
        "GET /api/info?full=1 HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n"
        "Authorization: Basic Og==\r\n\r\n";
    Wait(fd, false);
    if (write(fd, kRequest, sizeof(kRequest) - 1) < 0) std::abort();
    static char reply[65536];
    const ssize_t size = Read(fd, reply, 64512);
    // The end of the stream is met by a large read and looked at by one more, and that twice: by
    // the call that delivers the last bytes, and by the one that finds none.
    for (const size_t room : {size_t{8130}, size_t{64512}, size_t{8192}, size_t{64512}}) {
      if (Read(fd, reply + size, std::min(room, sizeof(reply) - static_cast<size_t>(size))) != 0) {
        std::abort();
      }
    }
    close(fd);
    Parse(std::string(reply, static_cast<size_t>(size)));
  }

  int Connect() const {
    const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    struct addrinfo hints = {};
    hints.ai_family = AF_INET;
    hints.ai_socktype = SOCK_STREAM;
    struct addrinfo* list = nullptr;
    if (getaddrinfo(kHost, std::to_string(m_peer.Port()).c_str(), &hints, &list) != 0) std::abort();
    const int flags = fcntl(fd, F_GETFL);
    fcntl(fd, F_SETFL, flags | O_NONBLOCK);
    if (connect(fd, list->ai_addr, list->ai_addrlen) != 0 && errno == EINPROGRESS) {
      Wait(fd, false);
      int error = 0;
      socklen_t size = sizeof(error);
      getsockopt(fd, SOL_SOCKET, SO_ERROR, &error, &size);
    }
    fcntl(fd, F_SETFL, flags);
    freeaddrinfo(list);
    int on = 1;
    ioctl(fd, FIONBIO, &on);
    return fd;
  }

  static ssize_t Read(int fd, char* to, size_t room) {
    Wait(fd, true);
    return read(fd, to, room);
  }

  static void Wait(int fd, bool forReading) {
    fd_set wanted, exceptional;
    FD_ZERO(&wanted);
    FD_ZERO(&exceptional);
    FD_SET(fd, &wanted);
    FD_SET(fd, &exceptional);
    struct timeval left = {5, 0};
    select(fd + 1, forReading ? &wanted : nullptr, forReading ? nullptr : &wanted, &exceptional,
           &left);
  }

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
  static void Parse(const std::string& reply) {
    Json::Reader reader;
    Json::Value value;
    const std::string body = reply.substr(reply.find("\r\n\r\n") + 4);
    if (!reader.parse(body, value, true) || !value["success"].asBool()) std::abort();
  }
#pragma GCC diagnostic pop

  Peer m_peer{{JsonReply()}};
};

class DigestGet : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      TWHttpClient client(kHost, m_peer.Port(), "cgi/info.cgi", "admin", "secret", 5, false, true,
                          false, false, HTTP_VERSION_1_1, "");
      int status = 0;
      if (client.SendRequest(HTTP_METHOD_GET, "?") != HTTP_RET_OK ||
          client.CheckResponse(status) != HTTP_RET_OK) {
        std::abort();
      }
    }
  }

 private:
  Peer m_peer{{Reply("401 Unauthorized",
                     "WWW-Authenticate: Digest realm=\"camera\", nonce=\"5ca1ab1e0ddba11\", "
                     "qop=\"auth\", algorithm=MD5\r\n",
                     ""),
               JsonReply()}};
};

class FormPost : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      if (SendHttpPost(kHost, m_peer.Port(), "cgi/set.cgi", "name=front+door&fps=25&on=1",
                       "id=5f1d8c2a", 5) != 0) {
        std::abort();
      }
    }
  }

 private:
  Peer m_peer{{JsonReply()}};
};

class SoapPost : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      TWHttpClient client(kHost, m_peer.Port(), "soap/device", "", "", 5, false, true, false, false,
                          HTTP_VERSION_1_1, "");
      std::string reply;
      if (client.SendReqBySocketPost(m_body, reply) != HTTP_RET_OK) std::abort();
    }
  }

 private:
  const std::string m_body = Envelope(4096);
  Peer m_peer{{Reply("200 OK", "Content-Type: application/soap+xml\r\n", Envelope(4096))}};
};

class SoapXmlPost : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      TWHttpClient client(kHost, m_peer.Port(), "soap/device", "", "", 5, false, true, false, false,
                          HTTP_VERSION_1_1, "");
      xmlDoc* doc = nullptr;
      if (client.SendReqByXMLSocketPost(m_body, doc) != HTTP_RET_OK || doc == nullptr) std::abort();
      xmlFreeDoc(doc);
    }
  }

 private:
  const std::string m_body = Envelope(512);
  Peer m_peer{{Reply(
      "200 OK", "Content-Type: application/soap+xml\r\n",
      "<e:Envelope xmlns:e=\"urn:e\">\r\n  <e:Body>\r\n<a>1\r\n2</a></e:Body>\r\n</e:Envelope>")}};
};

}  // namespace

void AddRequestOperations(std::vector<Entry>* entries) {
  entries->push_back({"json_get", "json_get_floor", 20, 0, Make<JsonGet>});
  entries->push_back({"json_get_floor", "", 20, 0, Make<RequiredGet>});
  entries->push_back({"digest_get", "", 20, 0, Make<DigestGet>});
  entries->push_back({"form_post", "", 20, 0, Make<FormPost>});
  entries->push_back({"soap_post_4k", "", 20, 0, Make<SoapPost>});
  entries->push_back({"soap_xml", "", 20, 0, Make<SoapXmlPost>});
}
