// Response heads and lines, out of the read-ahead buffer.
#include <algorithm>
#include <cstdlib>

#include "bench/memory_client.h"
#include "bench/operations.h"
#include "bench/plain.h"
#include "bench/texts.h"

namespace {

class Head : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      m_client.Memory()->RewindBuffered();
      if (m_client.ParseHead() != HTTP_RET_OK) std::abort();
    }
  }

 private:
  MemoryClient m_client{HeadOf30Lines()};
};

class HeadFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) m_parser.Parse(m_head);
  }

 private:
  const std::string m_head = HeadOf30Lines();
  HeadParser m_parser;
};

class LineReading : public Operation {
 public:
  void Run(int count) override {
    char line[2048];
    for (int i = 0; i < count; ++i) {
      m_client.Memory()->RewindBuffered();
      for (size_t n = 0; n < m_lines; ++n) Use(line + m_client.ReadToLineEnd(line, sizeof(line)));
    }
  }

 private:
  const std::string m_text = Lines();
  const size_t m_lines = static_cast<size_t>(std::count(m_text.begin(), m_text.end(), '\n'));
  MemoryClient m_client{m_text};
};

class LineReadingFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) CopyLines(m_text);
  }

 private:
  const std::string m_text = Lines();
};

}  // namespace

void AddHeadOperations(std::vector<Entry>* entries) {
  entries->push_back({"head_30", "head_30_floor", 200, HeadOf30Lines().size(), Make<Head>});
  entries->push_back({"head_30_floor", "", 200, HeadOf30Lines().size(), Make<HeadFloor>});
  entries->push_back({"lines", "lines_floor", 12, Lines().size(), Make<LineReading>});
  entries->push_back({"lines_floor", "", 12, Lines().size(), Make<LineReadingFloor>});
}
