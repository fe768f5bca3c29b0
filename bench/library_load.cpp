// What loading costs: the dependencies that programs have anyway, and the library on top of them.
#include <sstream>

#include "bench/apart.h"

namespace {

// Each in a process without any of them.
class Loading : public Contender {
 public:
  Loading(std::vector<std::string> before, const std::vector<std::string>& measured)
      : m_command{TARNWICK_BENCH_LOAD} {
    m_command.insert(m_command.end(), before.begin(), before.end());
    m_command.emplace_back("--");
    m_command.insert(m_command.end(), measured.begin(), measured.end());
  }

  double Measure(int count) override {
    double all = 0;
    for (int i = 0; i < count; ++i) all += NumberPrintedBy(m_command);
    return all / count;
  }

 private:
  std::vector<std::string> m_command;
};

std::vector<std::string> Dependencies() {
  std::istringstream words(TARNWICK_BENCH_DEPENDENCIES);
  std::vector<std::string> files;
  for (std::string file; words >> file;) files.push_back(file);
  return files;
}

void AddLoad(Registry* registry) {
  registry->Add("load", "dependencies", [] {
    return std::make_unique<Loading>(std::vector<std::string>(), Dependencies());
  });
  registry->Add("load", kLibrary, [] {
    return std::make_unique<Loading>(Dependencies(),
                                     std::vector<std::string>{TARNWICK_BENCH_LIBRARY});
  });
}

const Family kLibraryLoad(AddLoad);

}  // namespace
