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
  m_held.append(bytes);
  TakeLines(sink);
  if (m_held.size() > kLongest) End(sink);
}

// One pass over the new lines; what was given out is erased once, because each erasure moves the
// rest.
void MessageSplitter::TakeLines(const MessageSink& sink) {
  const std::string_view held(m_held);
  size_t begin = 0;
  size_t lines = m_lines;
  for (size_t end = held.find('\n', lines); end != std::string_view::npos;
       end = held.find('\n', lines)) {
    const bool begins = BeginsMessage(held.substr(lines, end + 1 - lines));
    if (begins && lines > begin) sink(held.substr(begin, lines - begin), m_continues);
    if (begins) {
      begin = lines;
      m_continues = false;
    }
    lines = end + 1;
  }
  m_held.erase(0, begin);
  m_lines = lines - begin;
}

void MessageSplitter::Flush(const MessageSink& sink) {
  if (m_lines > 0) GiveOut(m_lines, sink);
}

void MessageSplitter::End(const MessageSink& sink) {
  if (m_held.empty()) return;
  // An incomplete last line may begin a message of its own.
  if (m_lines > 0 && m_lines < m_held.size() &&
      BeginsMessage(std::string_view(m_held).substr(m_lines))) {
    GiveOut(m_lines, sink);
    m_continues = false;
  }
  GiveOut(m_held.size(), sink);
}

void MessageSplitter::GiveOut(size_t size, const MessageSink& sink) {
  sink(std::string_view(m_held).substr(0, size), m_continues);
  m_held.erase(0, size);
  m_lines = 0;
  m_continues = true;
}
