// The journal: a JSON object a line for each connection, and a short line for each response.
#ifndef TARNWICK_TOOLS_TWCAMSIM_JOURNAL_H_
#define TARNWICK_TOOLS_TWCAMSIM_JOURNAL_H_

#include <json/value.h>

#include <cstdio>
#include <mutex>
#include <string>

// Threads: any.
class Journal {
 public:
  Journal() = default;
  ~Journal();
  Journal(const Journal&) = delete;
  Journal& operator=(const Journal&) = delete;

  // Appends to the file, which is made for the caller alone: it holds credentials. A link and the
  // file of another user are refused. "-" is standard output, and an empty name nothing at all.
  // Results: false with the reason in `error`.
  bool Open(const std::string& path, std::string* error);

  bool IsOpen() const { return file_ != nullptr; }

  void Write(const std::string& line);

 private:
  std::mutex mutex_;
  FILE* file_ = nullptr;
};

// "2026-03-05T14:03:09.417Z"
std::string TimeText();

// `text` for the journal: what is longer than 64 KiB is cut.
std::string Excerpt(const std::string& text);

#endif  // TARNWICK_TOOLS_TWCAMSIM_JOURNAL_H_
