#include "tools/twcamsim/response.h"

#include <fmt/format.h>

#include <algorithm>
#include <utility>

namespace {

const char* UsualReason(int status) {
  static const std::vector<std::pair<int, const char*>> kReasons = {
      {100, "Continue"},
      {200, "OK"},
      {201, "Created"},
      {204, "No Content"},
      {302, "Found"},
      {304, "Not Modified"},
      {400, "Bad Request"},
      {401, "Unauthorized"},
      {403, "Forbidden"},
      {404, "Not Found"},
      {405, "Method Not Allowed"},
      {408, "Request Timeout"},
      {411, "Length Required"},
      {413, "Payload Too Large"},
      {414, "URI Too Long"},
      {415, "Unsupported Media Type"},
      {500, "Internal Server Error"},
      {501, "Not Implemented"},
      {503, "Service Unavailable"},
  };
  for (const auto& [known, reason] : kReasons) {
    if (known == status) return reason;
  }
  return "Unusual";
}

bool HasBody(const Response& response, const Request& request) {
  return request.method != "HEAD" && response.status >= 200 && response.status != 204 &&
         response.status != 304;
}

void Add(Wire* wire, Part part, std::string bytes) {
  wire->push_back({Action::kSend, part, std::move(bytes), {}});
}

void AddHeader(Wire* wire, const std::string& name, const std::string& value) {
  Add(wire, Part::kHeader, name + ": " + value + "\r\n");
}

void AddHead(const Response& response, const Request& request, Wire* wire) {
  const std::string reason =
      response.reason.empty() ? UsualReason(response.status) : response.reason;
  Add(wire, Part::kStatusLine, fmt::format("HTTP/1.1 {} {}\r\n", response.status, reason));
  for (const Header& header : response.headers) AddHeader(wire, header.name, header.value);
  if (response.chunked) {
    AddHeader(wire, "Transfer-Encoding", "chunked");
  } else if (!response.more && HasBody(response, request)) {
    AddHeader(wire, "Content-Length", std::to_string(response.body.size()));
  }
  AddHeader(wire, "Connection", response.close ? "close" : "keep-alive");
  Add(wire, Part::kBlank, "\r\n");
}

void AddChunks(const Response& response, Wire* wire) {
  for (size_t at = 0; at < response.body.size(); at += response.chunk_size) {
    const std::string piece = response.body.substr(at, response.chunk_size);
    Add(wire, Part::kChunkSize, fmt::format("{:x}\r\n", piece.size()));
    Add(wire, Part::kBody, piece);
    Add(wire, Part::kChunkEnd, "\r\n");
  }
  Add(wire, Part::kLastChunk, "0\r\n\r\n");
}

auto FindHeader(Wire* wire, std::string_view name) {
  return std::find_if(wire->begin(), wire->end(), [name](const WireStep& step) {
    return step.part == Part::kHeader && SameName(step.bytes.substr(0, name.size()), name);
  });
}

}  // namespace

void Response::Set(std::string_view name, const std::string& value) {
  for (Header& header : headers) {
    if (SameName(header.name, name)) {
      header.value = value;
      return;
    }
  }
  headers.push_back({std::string(name), value});
}

std::string Response::Get(std::string_view name) const {
  for (const Header& header : headers) {
    if (SameName(header.name, name)) return header.value;
  }
  return "";
}

Response MakeResponse(int status, const std::string& type, const std::string& body) {
  Response response;
  response.status = status;
  response.Set("Content-Type", type);
  response.body = body;
  return response;
}

Wire RenderResponse(const Response& response, const Request& request) {
  if (response.raw) return response.steps;
  Wire wire;
  AddHead(response, request, &wire);
  if (response.more || !HasBody(response, request)) return wire;
  if (response.chunked) {
    AddChunks(response, &wire);
  } else {
    Add(&wire, Part::kBody, response.body);
  }
  return wire;
}

std::string WireBytes(const Wire& wire) {
  std::string bytes;
  for (const WireStep& step : wire) bytes += step.bytes;
  return bytes;
}

void SetWireHeader(Wire* wire, std::string_view name, const std::string& value) {
  const std::string line = std::string(name) + ": " + value + "\r\n";
  const auto found = FindHeader(wire, name);
  if (found != wire->end()) {
    found->bytes = line;
    return;
  }
  const auto blank = static_cast<Wire::difference_type>(FindPart(*wire, Part::kBlank));
  wire->insert(wire->begin() + blank, {Action::kSend, Part::kHeader, line, {}});
}

void RemoveWireHeader(Wire* wire, std::string_view name) {
  const auto found = FindHeader(wire, name);
  if (found != wire->end()) wire->erase(found);
}

size_t FindPart(const Wire& wire, Part part) {
  size_t at = 0;
  while (at < wire.size() && wire[at].part != part) ++at;
  return at;
}
