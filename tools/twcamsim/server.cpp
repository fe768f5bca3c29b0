#include "tools/twcamsim/server.h"

#include <unistd.h>

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/signal_set.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/system/system_error.hpp>
#include <csignal>
#include <list>
#include <system_error>
#include <thread>

namespace asio = boost::asio;
using asio::ip::tcp;
using boost::system::error_code;

namespace {

constexpr size_t kMostConnections = 200;  // each takes four descriptors of the usual 1024
constexpr std::chrono::milliseconds kFullWait{20};

struct Served {
  std::unique_ptr<Session> session;
  std::thread thread;
};

// An endpoint's socket.
struct Listener {
  Listener(asio::io_context* io, Endpoint* served) : endpoint(served), acceptor(*io), timer(*io) {}

  Endpoint* endpoint;
  tcp::acceptor acceptor;
  asio::steady_timer timer;
  std::vector<tcp::socket> fillers;  // hold the places of a black hole's queue
};

std::string Url(const Endpoint& endpoint) {
  return std::string(endpoint.tls ? "https" : "http") + "://" + endpoint.host + ":" +
         std::to_string(endpoint.port) + "/";
}

}  // namespace

struct Server::Impl {
  bool Open(Listener* listener, std::string* error);
  bool OpenQueue(Listener* listener, error_code* code);
  void FillQueue(Listener* listener);
  void Accept(Listener* listener);
  void AcceptLater(Listener* listener);
  void Begin(Endpoint* endpoint, tcp::socket socket);
  void Reap();
  void EndAll();

  SharedState* shared = nullptr;
  std::vector<std::unique_ptr<Endpoint>> endpoints;
  asio::io_context io{1};
  // From here on, so that a signal that comes between the list of ports and Run is not lost.
  asio::signal_set signals{io, SIGTERM, SIGINT};
  std::vector<std::unique_ptr<Listener>> listeners;
  std::list<Served> served;
};

Server::Server(SharedState* shared, std::vector<std::unique_ptr<Endpoint>> endpoints)
    : impl_(std::make_unique<Impl>()) {
  impl_->shared = shared;
  impl_->endpoints = std::move(endpoints);
}

Server::~Server() = default;

bool Server::Listen(std::string* error) {
  for (const auto& endpoint : impl_->endpoints) {
    impl_->listeners.push_back(std::make_unique<Listener>(&impl_->io, endpoint.get()));
    if (!impl_->Open(impl_->listeners.back().get(), error)) return false;
  }
  return true;
}

bool Server::Impl::Open(Listener* listener, std::string* error) {
  Endpoint* endpoint = listener->endpoint;
  error_code code;
  const asio::ip::address_v4 address = asio::ip::make_address_v4(endpoint->host, code);
  if (!code) listener->acceptor.open(tcp::v4(), code);
  if (!code) listener->acceptor.set_option(tcp::acceptor::reuse_address(true), code);
  if (!code) listener->acceptor.bind({address, endpoint->port}, code);
  if (!code) endpoint->port = listener->acceptor.local_endpoint(code).port();
  if (!code && OpenQueue(listener, &code)) return true;
  *error = endpoint->name + " at " + endpoint->host + ":" + std::to_string(endpoint->port) + ": " +
           code.message();
  return false;
}

// A bound port that does not listen refuses, and nobody else gets it.
bool Server::Impl::OpenQueue(Listener* listener, error_code* code) {
  Random unused(shared->seed, 0, 0);
  switch (BehaviourOf(listener->endpoint->faults, &unused).listening) {
    case Listening::kRefuse:
      break;
    case Listening::kBlackHole:
      listener->acceptor.listen(0, *code);
      if (!*code) FillQueue(listener);
      break;
    case Listening::kAccept:
      listener->acceptor.listen(asio::socket_base::max_listen_connections, *code);
      if (!*code) Accept(listener);
      break;
  }
  return !*code;
}

// While a listener's queue is full, the kernel drops what would come into it. A queue of length 0
// has room for one connection; a second may be half open beside it.
void Server::Impl::FillQueue(Listener* listener) {
  error_code code;
  const tcp::endpoint own = listener->acceptor.local_endpoint(code);
  for (int i = 0; i < 4; ++i) {
    listener->fillers.emplace_back(io, tcp::v4());
    tcp::socket& filler = listener->fillers.back();
    filler.native_non_blocking(true, code);
    // Fails with EINPROGRESS. tcp::socket::connect would wait for the handshake, whatever the
    // socket's mode is.
    (void)::connect(filler.native_handle(), own.data(), static_cast<socklen_t>(own.size()));
  }
}

void Server::Impl::Accept(Listener* listener) {
  Reap();
  if (served.size() >= kMostConnections) {
    AcceptLater(listener);
    return;
  }
  listener->acceptor.async_accept([this, listener](const error_code& code, tcp::socket socket) {
    if (code == asio::error::operation_aborted) return;
    if (code) {  // no descriptor is left, say
      AcceptLater(listener);
      return;
    }
    Begin(listener->endpoint, std::move(socket));
    Accept(listener);
  });
}

void Server::Impl::AcceptLater(Listener* listener) {
  listener->timer.expires_after(kFullWait);
  listener->timer.async_wait([this, listener](const error_code& code) {
    if (!code) Accept(listener);
  });
}

void Server::Impl::Begin(Endpoint* endpoint, tcp::socket socket) {
  const int number = ++endpoint->connections;
  error_code code;
  const int fd = socket.release(code);
  if (code) return;
  Served& one = served.emplace_back();
  try {
    one.session = std::make_unique<Session>(shared, endpoint, fd, number);
    one.thread = std::thread([this, session = one.session.get()] {
      session->Run();
      asio::post(io, [this] { Reap(); });
    });
  } catch (const std::system_error&) {  // no thread is left: the client's connection closes
    served.pop_back();
  } catch (const boost::system::system_error&) {  // no descriptor is, for what a session needs
    served.pop_back();
    ::close(fd);
  }
}

void Server::Impl::Reap() {
  for (auto it = served.begin(); it != served.end();) {
    if (it->session->IsFinished()) {
      it->thread.join();
      it = served.erase(it);
    } else {
      ++it;
    }
  }
}

void Server::Impl::EndAll() {
  for (Served& one : served) one.session->Stop();
  for (Served& one : served) one.thread.join();
  served.clear();
}

Json::Value Server::Describe() const {
  Json::Value list(Json::arrayValue);
  for (const auto& endpoint : impl_->endpoints) {
    Json::Value entry(Json::objectValue);
    entry["name"] = endpoint->name;
    entry["profile"] = endpoint->type->name;
    entry["host"] = endpoint->host;
    entry["port"] = endpoint->port;
    entry["tls"] = endpoint->tls;
    entry["url"] = Url(*endpoint);
    entry["login"] = endpoint->authentication_style;
    entry["user"] = endpoint->authenticator.GetAccount().user;
    entry["password"] = endpoint->authenticator.GetAccount().password;
    entry["realm"] = endpoint->authenticator.GetAccount().realm;
    entry["faults"] = Json::Value(Json::arrayValue);
    for (const Fault& fault : endpoint->faults) entry["faults"].append(fault.text);
    list.append(entry);
  }
  return list;
}

void Server::Run(std::chrono::milliseconds limit) {
  impl_->signals.async_wait([this](const error_code& code, int) {
    if (!code) impl_->io.stop();
  });
  asio::steady_timer end(impl_->io);
  if (limit.count() > 0) {
    end.expires_after(limit);
    end.async_wait([this](const error_code& code) {
      if (!code) impl_->io.stop();
    });
  }
  impl_->io.run();
  impl_->listeners.clear();
  impl_->EndAll();
}
