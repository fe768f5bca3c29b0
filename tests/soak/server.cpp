#include "tests/soak/server.h"

#include "tests/soak/response.h"

namespace {

void ServeHttp(ServerConnection& connection, unsigned /*number*/) {
  if (!connection.Open()) return;
  Request request;
  while (ReadRequest(&connection, &request) && SendResponse(&connection, request)) {
  }
}

void HangUp(ServerConnection& /*connection*/, unsigned /*number*/) {}

void SendNoise(ServerConnection& connection, unsigned number) {
  if (connection.WriteBelowTls(Noise(number))) connection.Cut();
}

void StaySilent(ServerConnection& connection, unsigned /*number*/) {
  connection.Stall();
}

TlsOptions OfAStranger() {
  TlsOptions options;
  options.authority = "Another authority";
  options.wrong_host = true;
  return options;
}

}  // namespace

Server::Server()
    : identity_(TlsOptions()),
      stranger_(OfAStranger()),
      process_({{ServeHttp},
                {ServeHttp, &identity_},
                {ServeHttp, &stranger_},
                {HangUp},
                {SendNoise},
                {StaySilent}},
               ServerProcess::Connections::kInThreads),
      ports_{process_.Port(0), process_.Port(1), process_.Port(2),
             process_.Port(3), process_.Port(4), process_.Port(5)} {}
