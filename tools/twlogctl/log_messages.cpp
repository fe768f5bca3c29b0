#include "tools/twlogctl/log_messages.h"

#include "tools/twlogctl/log_line.h"

namespace {

// What is longer is given out in parts: a file that is no log must not fill the memory.
constexpr size_t kLongest = 1 << 20;

bool BeginsMessage(std::string_view line) {
  LogLine parsed;
  return ParseLogLine(line, &parsed);
}

}  // namespace

void MessageSplitter::Feed(std::string_view bytes, const MessageSink& sink) {
  held_.append(bytes);
  TakeLines(sink);
  if (held_.size() > kLongest) End(sink);
}

// One pass over the new lines; what was given out is erased once, because each erasure moves the
// rest.
void MessageSplitter::TakeLines(const MessageSink& sink) {
  const std::string_view held(held_);
  size_t begin = 0;
  size_t lines = lines_;
  for (size_t end = held.find('\n', lines); end != std::string_view::npos;
       end = held.find('\n', lines)) {
    const bool begins = BeginsMessage(held.substr(lines, end + 1 - lines));
    if (begins && lines > begin) sink(held.substr(begin, lines - begin), continues_);
    if (begins) {
      begin = lines;
      continues_ = false;
    }
    lines = end + 1;
  }
  held_.erase(0, begin);
  lines_ = lines - begin;
}

void MessageSplitter::Flush(const MessageSink& sink) {
  if (lines_ > 0) GiveOut(lines_, sink);
}

void MessageSplitter::End(const MessageSink& sink) {
  if (held_.empty()) return;
  // An incomplete last line may begin a message of its own.
  if (lines_ > 0 && lines_ < held_.size() &&
      BeginsMessage(std::string_view(held_).substr(lines_))) {
    GiveOut(lines_, sink);
    continues_ = false;
  }
  GiveOut(held_.size(), sink);
}

void MessageSplitter::GiveOut(size_t size, const MessageSink& sink) {
  sink(std::string_view(held_).substr(0, size), continues_);
  held_.erase(0, size);
  lines_ = 0;
  continues_ = true;
}
