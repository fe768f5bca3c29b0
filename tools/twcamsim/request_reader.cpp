#include "tools/twcamsim/request_reader.h"

#include <algorithm>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <limits>

namespace beast = boost::beast;
namespace http = boost::beast::http;

namespace {

constexpr size_t kMostHead = 1 << 20;
constexpr int64_t kMostBody = 64 << 20;

// The size of the head, its blank line included; npos when that has not come.
size_t HeadSize(const std::string& bytes) {
  const size_t end = bytes.find("\r\n\r\n");
  return end == std::string::npos ? end : end + 4;
}

// A client of TLS waits for its answer, so that its blank line would never come.
bool MayBecomeHead(const std::string& bytes, std::string* complaint) {
  if (bytes.size() > kMostHead) *complaint = "the head is longer than 1 MiB";
  if (!bytes.empty() && bytes[0] == '\x16') *complaint = "the client speaks TLS, not HTTP";
  return complaint->empty();
}

// Clients in the field put a blank in front of a colon, which the parser refuses. Takes it out of
// the header lines and tells whether there was one.
bool RemoveBlanksBeforeColons(std::string* head) {
  bool found = false;
  for (size_t line = head->find("\r\n"); line != std::string::npos;
       line = head->find("\r\n", line + 2)) {
    const size_t colon = head->find(':', line);
    const size_t end = head->find("\r\n", line + 2);
    if (colon == std::string::npos || colon > end) continue;
    const size_t name = head->find_last_not_of(" \t", colon - 1);
    if (name + 1 == colon || name <= line + 1) continue;
    head->erase(name + 1, colon - name - 1);
    found = true;
  }
  return found;
}

// The same for a "close;" with its semicolon. One change does: nobody sends two such lines.
bool RemoveSemicolonOfConnection(std::string* head) {
  constexpr std::string_view kName = "Connection:";
  for (size_t line = head->find("\r\n"); line + 2 < head->size();
       line = head->find("\r\n", line + 2)) {
    const size_t end = head->find("\r\n", line + 2);
    if (end == std::string::npos) break;
    const std::string_view text = std::string_view(*head).substr(line + 2, end - line - 2);
    if (!SameName(text.substr(0, kName.size()), kName) || text.back() != ';') continue;
    head->erase(end - 1, 1);
    return true;
  }
  return false;
}

// Makes a head one that the parser takes; tells in `sloppy` what it was.
void Tolerate(std::string* head, std::string* sloppy) {
  if (RemoveBlanksBeforeColons(head)) *sloppy = "blank in front of a colon";
  if (RemoveSemicolonOfConnection(head)) {
    *sloppy += std::string(sloppy->empty() ? "" : ", ") + "semicolon behind Connection's value";
  }
}

std::string Text(beast::string_view text) {
  return {text.data(), text.size()};
}

}  // namespace

struct RequestReader::Parser {
  Parser() {
    parser.eager(true);
    parser.header_limit(kMostHead);
    // A stream announces what it likes; for all else ReadBody has a limit.
    parser.body_limit(std::numeric_limits<uint64_t>::max());
  }
  int64_t BodySize() const { return static_cast<int64_t>(parser.get().body().size()); }

  http::request_parser<http::string_body> parser;
};

RequestReader::RequestReader(Link* link, const Behaviour& behaviour, Milliseconds limit)
    : link_(link), behaviour_(behaviour), limit_(limit) {}

RequestReader::~RequestReader() = default;

Io RequestReader::ReadMore() {
  size_t most = 65536;
  if (behaviour_.read_piece > 0) {
    result_ = link_->Pause(behaviour_.read_interval);
    if (result_ != Io::kDone) return result_;
    most = std::min(most, behaviour_.read_piece);
  }
  if (behaviour_.request_limit >= 0) {
    if (taken_ >= behaviour_.request_limit) return result_ = Io::kEnd;
    const int64_t left = behaviour_.request_limit - taken_;
    most = static_cast<size_t>(std::min(static_cast<int64_t>(most), left));
  }
  const size_t before = pending_.size();
  result_ = link_->Read(&pending_, most, limit_);
  taken_ += static_cast<int64_t>(pending_.size() - before);
  return result_;
}

Reading RequestReader::ReadHead(Request* request) {
  while (HeadSize(pending_) == std::string::npos) {
    if (behaviour_.request_limit >= 0 && taken_ >= behaviour_.request_limit) {
      request->head = pending_;
      return Reading::kLimit;
    }
    if (!MayBecomeHead(pending_, &request->sloppy)) return Reading::kBad;
    if (ReadMore() != Io::kDone) {
      request->head = pending_;
      return pending_.empty() ? Reading::kNothing : Reading::kBroken;
    }
  }
  const size_t size = HeadSize(pending_);
  request->head = pending_.substr(0, size);
  pending_.erase(0, size);
  return Parse(request);
}

Reading RequestReader::Parse(Request* request) {
  std::string head = request->head;
  Tolerate(&head, &request->sloppy);
  parser_ = std::make_unique<Parser>();
  beast::error_code code;
  auto& parser = parser_->parser;
  parser.put(boost::asio::buffer(head), code);
  if (code && code != http::error::need_more) {
    request->sloppy = code.message();
    return Reading::kBad;
  }
  request->method = Text(parser.get().method_string());
  request->target = Text(parser.get().target());
  request->version = static_cast<int>(parser.get().version());
  const size_t mark = request->target.find('?');
  request->path = request->target.substr(0, mark);
  if (mark != std::string::npos) request->query = request->target.substr(mark + 1);
  for (const auto& field : parser.get()) {
    request->headers.push_back({Text(field.name_string()), Text(field.value())});
  }
  return Reading::kDone;
}

Reading RequestReader::ReadBody(Request* request) {
  auto& parser = parser_->parser;
  while (!parser.is_done()) {
    if (request->Length() > kMostBody || parser_->BodySize() > kMostBody) {
      request->sloppy = "the body is longer than 64 MiB";
      return Reading::kBad;
    }
    if (pending_.empty()) {
      if (behaviour_.request_limit >= 0 && taken_ >= behaviour_.request_limit) {
        return Reading::kLimit;
      }
      if (ReadMore() != Io::kDone) break;
    }
    beast::error_code code;
    pending_.erase(0, parser.put(boost::asio::buffer(pending_), code));
    if (code == http::error::need_more) {
      if (ReadMore() != Io::kDone) break;
    } else if (code) {
      request->sloppy = code.message();
      return Reading::kBad;
    }
  }
  request->body = parser.get().body();
  return parser.is_done() ? Reading::kDone : Reading::kBroken;
}

Io RequestReader::ReadStream(std::string* bytes) {
  if (pending_.empty() && ReadMore() != Io::kDone) return result_;
  bytes->append(pending_);
  pending_.clear();
  return Io::kDone;
}
