// The hook of libcurl: it tells of itself what the other hooks see of the library's own sockets.
#include <curl/curl.h>
#include <sys/socket.h>

#include <cerrno>
#include <cstring>
#include <string_view>

#include "tools/twhttp/fake_peer.h"
#include "tools/twhttp/hooks.h"
#include "tools/twhttp/watchdog.h"

namespace {

struct Transfer {
  Hooks* hooks;
  double begin;
  char error[CURL_ERROR_SIZE];

  int Number() const {
    const Connection* const newest = hooks->trace->LastConnection();
    return newest != nullptr ? newest->number : 0;
  }
};

bool BeginsWith(std::string_view text, std::string_view start) {
  return text.substr(0, start.size()) == start;
}

// What libcurl tells of the server's TLS.
void NoteTls(Connection* connection, std::string_view text) {
  constexpr std::string_view kUsing = "SSL connection using ";
  if (BeginsWith(text, kUsing)) connection->tls_facts = std::string(text.substr(kUsing.size()));
  for (const std::string_view fact : {"subject: ", "expire date: ", "issuer: "}) {
    if (!BeginsWith(text, fact)) continue;
    connection->certificate += (connection->certificate.empty() ? "" : ", ") + std::string(text);
  }
}

// Only what stays the same from version to version is read out of libcurl's lines.
void NoteText(Transfer* transfer, std::string_view text) {
  Trace* const trace = transfer->hooks->trace;
  const double now = transfer->hooks->Now();
  while (!text.empty() && text.back() == '\n') text.remove_suffix(1);
  while (!text.empty() && text.front() == ' ') text.remove_prefix(1);
  trace->notes.emplace_back(text);
  const Connection* const newest = trace->LastConnection();
  if (newest != nullptr) NoteTls(trace->Find(newest->number), text);
  if (BeginsWith(text, "Trying ")) {
    const bool fresh = newest == nullptr || newest->connect.end >= 0;
    Connection& connection = fresh ? trace->Open(false) : *trace->Find(newest->number);
    connection.connect.begin = now;
    const size_t end = text.rfind("...");
    connection.address = std::string(text.substr(7, end == text.npos ? end : end - 7));
  } else if (newest != nullptr && BeginsWith(text, "Connected to ")) {
    trace->Find(newest->number)->connect.end = now;
  } else if (newest != nullptr && BeginsWith(text, "Closing connection")) {
    trace->Ended(newest->number, now, End::kClosed, 0, "");
  }
}

// libcurl does not report the empty line after an interim response.
void EndInterim(Hooks* hooks, int connection) {
  const Exchange* const last = hooks->trace->LastExchange();
  if (last == nullptr || last->connection != connection || last->response.HeadComplete()) return;
  const std::string& head = last->response.Head();
  const bool ended = head.size() < 4 || head.compare(head.size() - 4, 4, "\r\n\r\n") == 0;
  if (!ended) hooks->trace->Received(connection, hooks->Now(), "\r\n");
}

int OnDebug(CURL* /*curl*/, curl_infotype type, char* data, size_t size, void* pointer) {
  Transfer* const transfer = static_cast<Transfer*>(pointer);
  Hooks* const hooks = transfer->hooks;
  const std::string_view bytes(data, size);
  const double now = hooks->Now();
  if (type == CURLINFO_TEXT) {
    NoteText(transfer, bytes);
  } else if (type == CURLINFO_HEADER_OUT || type == CURLINFO_DATA_OUT) {
    hooks->trace->Sent(transfer->Number(), now, now, bytes);
    hooks->Moved();
  } else if (type == CURLINFO_HEADER_IN && BeginsWith(bytes, "HTTP/")) {
    EndInterim(hooks, transfer->Number());
    hooks->trace->Received(transfer->Number(), now, bytes);
  } else if (type == CURLINFO_HEADER_IN || type == CURLINFO_DATA_IN) {
    hooks->trace->Received(transfer->Number(), now, bytes);
    hooks->Moved();
  }
  return 0;
}

int OnProgress(void* /*pointer*/, curl_off_t, curl_off_t, curl_off_t, curl_off_t) {
  return StopReason() == Stop::kNone ? 0 : 1;
}

// The address is the peer's, wherever libcurl, or a proxy setting, wants to go.
curl_socket_t OpenSocketToPeer(void* pointer, curlsocktype, struct curl_sockaddr* address) {
  const sockaddr_in& peer = static_cast<Transfer*>(pointer)->hooks->peer->Address();
  address->family = AF_INET;
  address->addrlen = sizeof(peer);
  std::memcpy(&address->addr, &peer, sizeof(peer));
  return socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
}

void GoOffline(CURL* curl, Transfer* transfer, curl_slist* names) {
  curl_easy_setopt(curl, CURLOPT_OPENSOCKETFUNCTION, OpenSocketToPeer);
  curl_easy_setopt(curl, CURLOPT_OPENSOCKETDATA, transfer);
  curl_easy_setopt(curl, CURLOPT_RESOLVE, names);  // so that no name is looked up
}

void SetObservers(CURL* curl, Transfer* transfer) {
  curl_easy_setopt(curl, CURLOPT_VERBOSE, 1L);
  curl_easy_setopt(curl, CURLOPT_DEBUGFUNCTION, OnDebug);
  curl_easy_setopt(curl, CURLOPT_DEBUGDATA, transfer);
  curl_easy_setopt(curl, CURLOPT_ERRORBUFFER, transfer->error);
  curl_easy_setopt(curl, CURLOPT_XFERINFOFUNCTION, OnProgress);
  curl_easy_setopt(curl, CURLOPT_NOPROGRESS, 0L);
}

double Seconds(CURL* curl, CURLINFO info) {
  constexpr double kMicroseconds = 1e-6;
  curl_off_t value = 0;
  curl_easy_getinfo(curl, info, &value);
  return static_cast<double>(value) * kMicroseconds;
}

void NoteFigures(CURL* curl, CURLcode code, const Transfer& transfer) {
  CurlFigures& figures = transfer.hooks->trace->curl;
  figures.code = code;
  long os_error = 0;
  curl_easy_getinfo(curl, CURLINFO_OS_ERRNO, &os_error);
  figures.os_error = static_cast<int>(os_error);
  figures.text = transfer.error[0] != '\0' ? transfer.error : curl_easy_strerror(code);
  figures.look_up = Seconds(curl, CURLINFO_NAMELOOKUP_TIME_T);
  figures.connect = Seconds(curl, CURLINFO_CONNECT_TIME_T);
  figures.handshake = Seconds(curl, CURLINFO_APPCONNECT_TIME_T);
  figures.total = Seconds(curl, CURLINFO_TOTAL_TIME_T);
}

// The first connection's steps, from libcurl's figures.
void NoteSteps(const Transfer& transfer) {
  Trace* const trace = transfer.hooks->trace;
  const CurlFigures& figures = trace->curl;
  if (trace->LastConnection() == nullptr) trace->Open(false);
  Connection* const first = trace->Find(1);
  const double begin = transfer.begin;
  if (figures.look_up > 0) {
    first->look_up.begin = begin;
    first->look_up.end = begin + figures.look_up;
  }
  if (figures.connect > 0) {
    first->connect.begin = begin + figures.look_up;
    first->connect.end = begin + figures.connect;
  }
  if (figures.handshake > 0) {
    first->tls = true;
    first->handshake.begin = begin + figures.connect;
    first->handshake.end = begin + figures.handshake;
  }
}

}  // namespace

extern "C" CURLcode __real_curl_easy_perform(CURL* curl);
extern "C" CURLcode __wrap_curl_easy_perform(CURL* curl) {
  Hooks* const hooks = CurrentHooks();
  if (hooks == nullptr) return __real_curl_easy_perform(curl);
  Transfer transfer = {hooks, hooks->Now(), ""};
  const std::string everything = "*:" + std::to_string(hooks->port) + ":127.0.0.1";
  curl_slist* const names = curl_slist_append(nullptr, everything.c_str());
  SetObservers(curl, &transfer);
  if (hooks->peer != nullptr) GoOffline(curl, &transfer, names);
  hooks->trace->curl.used = true;
  RestartWatchdog();
  const CURLcode code = __real_curl_easy_perform(curl);
  StopWatchdog();
  NoteFigures(curl, code, transfer);
  NoteSteps(transfer);
  // What the cleanup still says comes too late for the buffers here.
  curl_easy_setopt(curl, CURLOPT_VERBOSE, 0L);
  curl_easy_setopt(curl, CURLOPT_ERRORBUFFER, nullptr);
  curl_slist_free_all(names);
  return code;
}
