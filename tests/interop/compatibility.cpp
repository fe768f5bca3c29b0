#include "tests/interop/compatibility.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <vector>

namespace {

std::vector<Row> g_rows;

std::string OnOneLine(std::string text) {
  std::replace_if(
      text.begin(), text.end(), [](char c) { return c == '\n' || c == '\t'; }, ' ');
  return text;
}

class TableWriter : public ::testing::EmptyTestEventListener {
 public:
  void OnTestStart(const ::testing::TestInfo&) override { first_ = g_rows.size(); }

  void OnTestPartResult(const ::testing::TestPartResult& part) override {
    if (part.failed() && failure_.empty()) failure_ = OnOneLine(part.summary());
  }

  void OnTestEnd(const ::testing::TestInfo&) override {
    for (size_t i = first_; i < g_rows.size() && !failure_.empty(); ++i) {
      g_rows[i].result = "failed: " + failure_;
    }
    failure_.clear();
  }

  void OnTestProgramEnd(const ::testing::UnitTest&) override {
    const char* path = getenv("TARNWICK_COMPATIBILITY_FILE");
    if (path == nullptr) return;
    std::ofstream file(path, std::ios::trunc);
    for (const Row& row : g_rows) {
      file << row.operation << '\t' << row.server << '\t' << row.login << '\t' << row.transport
           << '\t' << row.reading << '\t' << row.result << '\n';
    }
  }

 private:
  size_t first_ = 0;
  std::string failure_;
};

class AddTableWriter : public ::testing::Environment {
 public:
  void SetUp() override { ::testing::UnitTest::GetInstance()->listeners().Append(new TableWriter); }
};

const auto* const kAddTableWriter = ::testing::AddGlobalTestEnvironment(new AddTableWriter);

}  // namespace

std::string NameOf(const Mode& mode) {
  return std::string(mode.tls ? "Tls" : "Plain") + (mode.buffered ? "Buffered" : "Direct");
}

std::ostream& operator<<(std::ostream& out, const Mode& mode) {
  return out << NameOf(mode);
}

void AddRow(const Row& row) {
  g_rows.push_back(row);
}

void Worked(const std::string& operation, const std::string& server, const std::string& login,
            const Mode& mode) {
  AddRow({operation, server, login, mode.tls ? "TLS" : "plain",
          mode.buffered ? "buffered" : "direct", "passed"});
}

void WorkedByCurl(const std::string& operation, const std::string& server, const std::string& login,
                  bool tls) {
  AddRow({operation, server, login, tls ? "TLS" : "plain", "libcurl", "passed"});
}
