// What a client makes of a response that ends early: a plain reading of the rules, without sockets,
// for comparison with the library's.
#ifndef TARNWICK_TESTS_MODEL_RESPONSE_H_
#define TARNWICK_TESTS_MODEL_RESPONSE_H_

#include <strings.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

#include "tarnwick/http/twhttp.h"

// A response as far as it comes, and whether a reset ends it or a close.
struct Cut {
  std::string bytes;
  bool reset = false;
};

struct ModelHead {
  bool complete = false;  // read up to its end, which opens the body
  int response = 0;       // what CheckResponse tells
  int status = 0;
  std::string length;
  std::string challenge;
  std::string encoding;
};

class CutReader {
 public:
  CutReader(Cut cut, bool buffered) : cut_(std::move(cut)), buffered_(buffered) {}

  // The count that TWSocket::ReadData returns. A reset makes one read fail; after that the stream
  // has ended.
  int Read(size_t wanted, std::string* bytes) {
    eof_ = false;
    const size_t taken = std::min(wanted, cut_.bytes.size() - at_);
    bytes->append(cut_.bytes, at_, taken);
    at_ += taken;
    const int count = static_cast<int>(taken);
    if (taken == wanted || (taken > 0 && !buffered_)) return count;
    eof_ = !cut_.reset;
    if (!std::exchange(cut_.reset, false)) return count;
    if (taken == 0) return -1;
    eof_ = wanted - taken >= 1024;  // a large read looks once more after the failure
    return count;
  }

  // A line without its end; false when reading failed.
  bool ReadLine(std::string* line) {
    line->clear();
    for (;;) {
      std::string byte;
      const int count = Read(1, &byte);
      if (count < 0) return false;
      if (count == 0 || byte == "\n") return true;
      if (byte == "\r") return Read(1, &byte) == 1;
      *line += byte;
    }
  }

  bool Ended() const { return eof_; }
  bool Buffered() const { return buffered_; }

 private:
  Cut cut_;
  const bool buffered_;
  size_t at_ = 0;
  bool eof_ = false;
};

// The words of a status line that counts.
inline int ModelStatusLine(const std::string& line, int* status) {
  const size_t blank = line.find(' ');
  if (line.empty()) return HTTP_RET_IO_ERROR;
  if (line.compare(0, 8, "HTTP/1.1") != 0) return HTTP_RET_BAD_RESPONSE;
  if (blank == std::string::npos || blank + 1 == line.size()) return HTTP_RET_IO_ERROR;
  *status = atoi(line.c_str() + blank + 1);
  if (*status >= 200 && *status <= 299) return HTTP_RET_OK;
  return *status == 401 ? HTTP_RET_UNAUTHORIZED : HTTP_RET_BAD_RESPONSE;
}

// A header line "Name: value"; false when a known name has nothing after it.
inline bool ModelHeaderLine(const std::string& line, ModelHead* head) {
  const std::pair<const char*, std::string*> known[] = {{"Content-Length", &head->length},
                                                        {"WWW-Authenticate", &head->challenge},
                                                        {"Transfer-Encoding", &head->encoding},
                                                        {"Content-Type", nullptr},
                                                        {"Set-Cookie", nullptr}};
  const size_t end = std::min(line.find(':'), line.size());
  for (const auto& [name, value] : known) {
    if (strcasecmp(name, line.substr(0, end).c_str()) != 0) continue;
    if (end + 1 >= line.size()) return false;
    const size_t begin = std::min(line.find_first_not_of(' ', end + 1), line.size());
    if (value != nullptr) *value = line.substr(begin);
  }
  return true;
}

inline ModelHead ReadModelHead(CutReader& reader, std::vector<std::string>* log) {
  ModelHead head;
  std::string line;
  head.response = HTTP_RET_IO_ERROR;
  if (!reader.ReadLine(&line)) return head;
  head.response = ModelStatusLine(line, &head.status);
  if (head.status == 0) return head;
  for (;;) {
    if (!reader.ReadLine(&line)) {
      log->push_back("CheckContentType: Connect failed!\n\n");
      head.response = HTTP_RET_IO_ERROR;
      return head;
    }
    if (line.empty()) break;
    if (!ModelHeaderLine(line, &head)) {
      head.response = HTTP_RET_NOT_READY;
      return head;
    }
  }
  head.complete = true;
  return head;
}

// Results: false when a read failed for which there is no excuse.
inline bool ReadModelChunks(CutReader& reader, std::string* body) {
  for (;;) {
    std::string line;
    const bool read = reader.ReadLine(&line);
    size_t left = read ? strtoul(line.c_str(), nullptr, 16) : 0;
    if (left == 0) return true;
    while (left > 0) {
      const int count = reader.Read(std::min<size_t>(left, 8192), body);
      if (count < 0) return false;
      left -= static_cast<size_t>(count);
      if (reader.Ended()) break;
    }
    std::string dropped;
    if (reader.Read(2, &dropped) == 1 && !reader.Buffered()) reader.Read(1, &dropped);
  }
}

inline bool ReadModelBody(CutReader& reader, const ModelHead& head, std::string* body) {
  if (!head.complete) return false;
  if (head.encoding == "chunked") return ReadModelChunks(reader, body);
  int count = 1;
  while (count > 0) count = reader.Read(8192, body);
  return count == 0;
}

#endif  // TARNWICK_TESTS_MODEL_RESPONSE_H_
