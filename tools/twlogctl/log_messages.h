// The messages in the bytes of a log.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_MESSAGES_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_MESSAGES_H_

#include <functional>
#include <string>
#include <string_view>

// Takes the text of one message: whole lines, the continuation lines included, with their line
// ends; only the last line of a file may lack it. `continues` is true for lines that belong to the
// message before, which had been given out already.
using MessageSink = std::function<void(std::string_view text, bool continues)>;

// Puts messages together from the bytes of one log, in the pieces in which they come.
class MessageSplitter {
 public:
  // Hands out each message whose end is known by the beginning of the next one.
  void Feed(std::string_view bytes, const MessageSink& sink);

  // Hands out the whole lines: nothing has followed for a while. An incomplete line stays.
  void Flush(const MessageSink& sink);

  // Hands out everything: the file has ended.
  void End(const MessageSink& sink);

  // True while there is something for Flush.
  bool Waits() const { return lines_ > 0; }

 private:
  void TakeLines(const MessageSink& sink);
  void GiveOut(size_t size, const MessageSink& sink);

  std::string held_;  // a message, of which the first `lines_` bytes are whole lines
  size_t lines_ = 0;
  bool continues_ = false;  // the held lines belong to a message that has been given out
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_MESSAGES_H_
