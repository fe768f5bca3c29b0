#include "tools/twhttp/message.h"

#include <strings.h>

#include <algorithm>
#include <cctype>
#include <cstdlib>

#include "tools/common/text.h"

namespace {

constexpr size_t kMaxHead = size_t{256} * 1024;

std::string_view Trimmed(std::string_view text) {
  const auto blank = [](char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; };
  while (!text.empty() && blank(text.front())) text.remove_prefix(1);
  while (!text.empty() && blank(text.back())) text.remove_suffix(1);
  return text;
}

std::pair<std::string, std::string> SplitHeader(std::string_view line) {
  const size_t colon = line.find(':');
  if (colon == std::string_view::npos) return {"", std::string(Trimmed(line))};
  return {std::string(Trimmed(line.substr(0, colon))),
          std::string(Trimmed(line.substr(colon + 1)))};
}

int LeadingNumber(std::string_view text) {
  constexpr long kMost = 999999;
  const long value = std::strtol(std::string(text).c_str(), nullptr, 10);
  return static_cast<int>(std::clamp(value, -1L, kMost));
}

bool IsHex(char c) {
  return std::isxdigit(static_cast<unsigned char>(c)) != 0;
}

}  // namespace

HeaderLines SplitHeaderLines(std::string_view head) {
  HeaderLines lines;
  for (bool first = true; !head.empty(); first = false) {
    const size_t end = std::min(head.find('\n'), head.size());
    const std::string_view line = Trimmed(head.substr(0, end));
    if (!first && !line.empty()) lines.push_back(SplitHeader(line));
    head.remove_prefix(std::min(end + 1, head.size()));
  }
  return lines;
}

void ResponseMessage::Feed(std::string_view bytes) {
  while (!bytes.empty()) {
    size_t used = bytes.size();
    if (state_ == State::kHead) {
      used = FeedHead(bytes);
    } else if (state_ == State::kBody) {
      used = FeedBody(bytes);
    } else {
      surplus_ += used;
    }
    bytes.remove_prefix(used);
  }
}

size_t ResponseMessage::FeedHead(std::string_view bytes) {
  const size_t end = bytes.find('\n');
  const size_t used = end == std::string_view::npos ? bytes.size() : end + 1;
  const std::string_view part = bytes.substr(0, used);
  head_bytes_ += used;
  if (head_.size() < kMaxHead) head_.append(part);
  if (line_.size() < kMaxHead) line_.append(part);
  if (end != std::string_view::npos) EndLine();
  return used;
}

void ResponseMessage::EndLine() {
  const std::string_view line = Trimmed(line_);
  if (line.empty() && !first_line_) {
    EndHead();
  } else if (first_line_) {
    const size_t blank = line.find(' ');
    if (line.substr(0, 5) == "HTTP/" && blank != std::string_view::npos) {
      status_ = LeadingNumber(line.substr(blank + 1));
    }
    first_line_ = false;
  } else {
    headers_.push_back(SplitHeader(line));
  }
  line_.clear();
}

void ResponseMessage::EndHead() {
  if (status_ >= 100 && status_ <= 199) {  // an interim response; the real one follows
    headers_.clear();
    first_line_ = true;
    ++interims_;
    return;
  }
  state_ = State::kBody;
  const std::string length = Value("Content-Length");
  if (status_ == 204 || status_ == 304) {
    framing_ = Framing::kNone;
  } else if (EqualsIgnoringCase(Value("Transfer-Encoding"), "chunked")) {
    framing_ = Framing::kChunked;
  } else if (!length.empty() && std::isdigit(static_cast<unsigned char>(length[0])) != 0) {
    framing_ = Framing::kLength;
    announced_ = std::strtoull(length.c_str(), nullptr, 10);
  } else {
    framing_ = Framing::kUntilClose;
  }
  const bool empty = framing_ == Framing::kLength && announced_ == 0;
  if (framing_ == Framing::kNone || empty) state_ = State::kDone;
}

size_t ResponseMessage::FeedBody(std::string_view bytes) {
  size_t used = bytes.size();
  if (framing_ == Framing::kChunked) {
    used = FeedChunked(bytes);
  } else if (framing_ == Framing::kLength) {
    used = static_cast<size_t>(std::min<uint64_t>(used, announced_ - body_bytes_));
  }
  body_bytes_ += used;
  if (framing_ == Framing::kLength && body_bytes_ == announced_) state_ = State::kDone;
  return used;
}

size_t ResponseMessage::FeedChunked(std::string_view bytes) {
  if (chunk_state_ == ChunkState::kData) {
    const size_t used = static_cast<size_t>(std::min<uint64_t>(bytes.size(), chunk_left_));
    chunk_left_ -= used;
    if (chunk_left_ == 0) chunk_state_ = ChunkState::kDataEnd;
    return used;
  }
  const size_t end = bytes.find('\n');
  const size_t used = end == std::string_view::npos ? bytes.size() : end + 1;
  if (line_.size() < kMaxHead) line_.append(bytes.substr(0, used));
  if (end != std::string_view::npos) EndChunkLine();
  return used;
}

void ResponseMessage::EndChunkLine() {
  const std::string line(Trimmed(line_));
  line_.clear();
  if (chunk_state_ == ChunkState::kDataEnd) {
    chunk_state_ = ChunkState::kSize;
    if (!line.empty()) bad_chunk_ = true;
  } else if (chunk_state_ == ChunkState::kSize) {
    if (line.empty() || !IsHex(line[0])) bad_chunk_ = true;
    chunk_left_ = std::strtoull(line.c_str(), nullptr, 16);
    chunk_state_ = chunk_left_ > 0 ? ChunkState::kData : ChunkState::kTrailer;
  } else if (line.empty()) {
    state_ = State::kDone;
  }
}

std::string ResponseMessage::Value(std::string_view name) const {
  std::string value;
  for (const auto& header : headers_) {
    if (EqualsIgnoringCase(header.first, name)) value = header.second;
  }
  return value;
}

std::string ResponseMessage::Missing() const {
  if (bad_chunk_) return "what stands in place of a chunk's size, or of the CRLF after it, is none";
  if (state_ != State::kBody) return "";
  if (framing_ == Framing::kLength) {
    return std::to_string(announced_) + " bytes were announced and " + std::to_string(body_bytes_) +
           " came";
  }
  if (framing_ != Framing::kChunked) return "";
  // After the last chunk only the empty line is missing, and the body is whole.
  if (chunk_state_ == ChunkState::kTrailer) return "";
  if (chunk_state_ == ChunkState::kData) {
    return std::to_string(chunk_left_) + " bytes of a chunk did not come";
  }
  return "the last chunk did not come";
}
