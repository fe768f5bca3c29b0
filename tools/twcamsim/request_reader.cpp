#include "tools/twcamsim/request_reader.h"

#include <algorithm>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <limits>
#include <string_view>
#include <utility>

namespace beast = boost::beast;
namespace http = boost::beast::http;

namespace {

constexpr size_t kMostHead = 1 << 20;
constexpr int64_t kMostBody = 64 << 20;

// A client of TLS waits for its response, so that its blank line would never come.
bool MayBecomeHead(const std::string& bytes, std::string* complaint) {
  if (bytes.size() > kMostHead) *complaint = "the head is longer than 1 MiB";
  if (!bytes.empty() && bytes[0] == '\x16') *complaint = "the client speaks TLS, not HTTP";
  return complaint->empty();
}

// The library's upload writes a blank before a colon (docs/wire.md), which the parser refuses.
// Takes it out of the header lines and returns whether there was one. One pass: a head has up to 1
// MiB of lines.
bool RemoveBlanksBeforeColons(std::string* head) {
  std::string cleaned;
  cleaned.reserve(head->size());
  bool found = false;
  for (size_t line = 0; line < head->size();) {
    const size_t end = std::min(head->find("\r\n", line), head->size());
    const std::string_view text = std::string_view(*head).substr(line, end - line);
    const size_t colon = line == 0 ? std::string_view::npos : text.find(':');
    const size_t name = text.substr(0, std::min(colon, text.size())).find_last_not_of(" \t");
    const bool blank =
        colon != std::string_view::npos && name != std::string_view::npos && name + 1 < colon;
    cleaned.append(text.substr(0, blank ? name + 1 : 0)).append(text.substr(blank ? colon : 0));
    const size_t next = std::min(end + 2, head->size());
    cleaned.append(*head, end, next - end);
    found = found || blank;
    line = next;
  }
  if (found) *head = std::move(cleaned);
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
    if (!EqualsIgnoringCase(text.substr(0, kName.size()), kName) || text.back() != ';') continue;
    head->erase(end - 1, 1);
    return true;
  }
  return false;
}

// Makes a head one that the parser takes; tells in `deviation` what it was.
void Tolerate(std::string* head, std::string* deviation) {
  if (RemoveBlanksBeforeColons(head)) *deviation = "blank in front of a colon";
  if (RemoveSemicolonOfConnection(head)) {
    *deviation +=
        std::string(deviation->empty() ? "" : ", ") + "semicolon after Connection's value";
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

RequestReader::RequestReader(Connection* connection, const Behaviour& behaviour, Milliseconds limit,
                             MemoryBudget* budget)
    : connection_(connection), behaviour_(behaviour), limit_(limit), budget_(budget) {}

RequestReader::~RequestReader() {
  budget_->Release(held_);
}

// The size of the head, its blank line included; npos when that has not come. What was searched is
// not searched again: a client may send its head byte by byte.
size_t RequestReader::HeadSize() {
  const size_t end = pending_.find("\r\n\r\n", searched_);
  if (end != std::string::npos) return end + 4;
  searched_ = pending_.size() < 3 ? 0 : pending_.size() - 3;
  return end;
}

void RequestReader::Release() {
  parser_.reset();
  budget_->Release(held_ - pending_.size());
  held_ = pending_.size();
}

Io RequestReader::ReadMore() {
  size_t most = 65536;
  if (behaviour_.read_piece > 0) {
    result_ = connection_->Pause(behaviour_.read_interval);
    if (result_ != Io::kDone) return result_;
    most = std::min(most, behaviour_.read_piece);
  }
  if (behaviour_.request_limit >= 0) {
    if (taken_ >= behaviour_.request_limit) return result_ = Io::kEnd;
    const int64_t left = behaviour_.request_limit - taken_;
    most = static_cast<size_t>(std::min(static_cast<int64_t>(most), left));
  }
  const size_t before = pending_.size();
  result_ = connection_->Read(&pending_, most, limit_);
  const size_t got = pending_.size() - before;
  taken_ += static_cast<int64_t>(got);
  full_ = !budget_->Take(got);
  if (!full_) {
    held_ += got;
    return result_;
  }
  pending_.resize(before);
  return result_ = Io::kError;
}

Reading RequestReader::ReadHead(Request* request) {
  Release();
  searched_ = 0;
  size_t size = HeadSize();
  for (; size == std::string::npos; size = HeadSize()) {
    if (behaviour_.request_limit >= 0 && taken_ >= behaviour_.request_limit) {
      request->head = pending_;
      return Reading::kLimit;
    }
    if (!MayBecomeHead(pending_, &request->deviation)) return Reading::kBad;
    if (ReadMore() != Io::kDone) {
      request->head = pending_;
      if (full_) return Reading::kFull;
      return pending_.empty() ? Reading::kNothing : Reading::kBroken;
    }
  }
  request->head = pending_.substr(0, size);
  pending_.erase(0, size);
  return Parse(request);
}

Reading RequestReader::Parse(Request* request) {
  std::string head = request->head;
  Tolerate(&head, &request->deviation);
  parser_ = std::make_unique<Parser>();
  beast::error_code code;
  auto& parser = parser_->parser;
  parser.put(boost::asio::buffer(head), code);
  if (code && code != http::error::need_more) {
    request->deviation = code.message();
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
      request->deviation = "the body is longer than 64 MiB";
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
      request->deviation = code.message();
      return Reading::kBad;
    }
  }
  const bool done = parser.is_done();
  request->body = std::move(parser.get().body());
  if (full_) return Reading::kFull;
  return done ? Reading::kDone : Reading::kBroken;
}

Io RequestReader::ReadStream(std::string* bytes) {
  if (pending_.empty() && ReadMore() != Io::kDone) return result_;
  bytes->append(pending_);
  pending_.clear();
  Release();
  return Io::kDone;
}
