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

void Add(Steps* steps, Part part, std::string bytes) {
  steps->push_back({Action::kSend, part, std::move(bytes), {}});
}

void AddHeader(Steps* steps, const std::string& name, const std::string& value) {
  Add(steps, Part::kHeader, name + ": " + value + "\r\n");
}

void AddHead(const Response& response, const Request& request, Steps* steps) {
  const std::string reason =
      response.reason.empty() ? UsualReason(response.status) : response.reason;
  Add(steps, Part::kStatusLine, fmt::format("HTTP/1.1 {} {}\r\n", response.status, reason));
  for (const Header& header : response.headers) AddHeader(steps, header.name, header.value);
  if (response.chunked) {
    AddHeader(steps, "Transfer-Encoding", "chunked");
  } else if (!response.more && HasBody(response, request)) {
    AddHeader(steps, "Content-Length", std::to_string(response.body.size()));
  }
  AddHeader(steps, "Connection", response.close ? "close" : "keep-alive");
  Add(steps, Part::kBlank, "\r\n");
}

void AddChunks(const Response& response, Steps* steps) {
  for (size_t at = 0; at < response.body.size(); at += response.chunk_size) {
    const std::string piece = response.body.substr(at, response.chunk_size);
    Add(steps, Part::kChunkSize, fmt::format("{:x}\r\n", piece.size()));
    Add(steps, Part::kBody, piece);
    Add(steps, Part::kChunkEnd, "\r\n");
  }
  Add(steps, Part::kLastChunk, "0\r\n\r\n");
}

auto FindHeader(Steps* steps, std::string_view name) {
  return std::find_if(steps->begin(), steps->end(), [name](const Step& step) {
    return step.part == Part::kHeader &&
           EqualsIgnoringCase(step.bytes.substr(0, name.size()), name);
  });
}

}  // namespace

void Response::Set(std::string_view name, const std::string& value) {
  for (Header& header : headers) {
    if (EqualsIgnoringCase(header.name, name)) {
      header.value = value;
      return;
    }
  }
  headers.push_back({std::string(name), value});
}

std::string Response::Get(std::string_view name) const {
  for (const Header& header : headers) {
    if (EqualsIgnoringCase(header.name, name)) return header.value;
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

Steps RenderResponse(const Response& response, const Request& request) {
  if (response.raw) return response.steps;
  Steps steps;
  AddHead(response, request, &steps);
  if (response.more || !HasBody(response, request)) return steps;
  if (response.chunked) {
    AddChunks(response, &steps);
  } else {
    Add(&steps, Part::kBody, response.body);
  }
  return steps;
}

std::string BytesOf(const Steps& steps) {
  std::string bytes;
  for (const Step& step : steps) bytes += step.bytes;
  return bytes;
}

void SetHeader(Steps* steps, std::string_view name, const std::string& value) {
  const std::string line = std::string(name) + ": " + value + "\r\n";
  const auto found = FindHeader(steps, name);
  if (found != steps->end()) {
    found->bytes = line;
    return;
  }
  const auto blank = static_cast<Steps::difference_type>(FindPart(*steps, Part::kBlank));
  steps->insert(steps->begin() + blank, {Action::kSend, Part::kHeader, line, {}});
}

void RemoveHeader(Steps* steps, std::string_view name) {
  const auto found = FindHeader(steps, name);
  if (found != steps->end()) steps->erase(found);
}

size_t FindPart(const Steps& steps, Part part) {
  size_t at = 0;
  while (at < steps.size() && steps[at].part != part) ++at;
  return at;
}
