// What there is to compare.
#include <algorithm>
#include <chrono>

#include "bench/contender.h"

namespace {

constexpr size_t kKiB = size_t{1} << 10;
constexpr size_t kMiB = size_t{1} << 20;

// The order of the tables.
constexpr const char* kContenders[] = {
    kFloor,  kRequired,     "dependencies", kLibrary, "libcurl",   "cpp-httplib", "Poco",
    "Beast", "std::remove", "spdlog",       "glog",   "log4cplus", "syslog",
};

size_t RankOf(const std::string& contender) {
  const auto found = std::find(std::begin(kContenders), std::end(kContenders), contender);
  Expect(found != std::end(kContenders), contender.c_str(), "has no place in the order");
  return static_cast<size_t>(found - std::begin(kContenders));
}

Registry* MutableRegistry() {
  static Registry registry;
  return &registry;
}

}  // namespace

const std::vector<Work>& AllWorks() {
  constexpr Unit kNs = Unit::kNanoseconds;
  static const std::vector<Work> works = {
      {"log", "log_disabled", kNs, 0, 0, true, 10000},
      {"log", "log_disabled_record", kNs, 0, 0, false, 10000},
      {"log", "log_line", kNs, 0, 2000, false, 200},
      {"log", "log_line_4_processes", kNs, 0, 16000, false, 0},
      {"log", "log_line_16_processes", kNs, 0, 32000, false, 0},
      {"request", "json_get", kNs, 0, 0, false, 20},
      {"request", "digest_get", kNs, 0, 0, false, 20},
      {"request", "form_post", kNs, 0, 0, false, 20},
      {"request", "soap_post_4k", kNs, 0, 0, false, 20},
      {"request", "soap_xml", kNs, 0, 0, false, 20},
      {"parse", "head_30", kNs, 0, 0, false, 200},
      {"parse", "lines", kNs, 60000, 0, false, 20},
      {"parse", "chunked_64", kNs, kMiB, 0, false, 4},
      {"parse", "chunked_4k", kNs, kMiB, 0, false, 4},
      {"parse", "memory_body_1m", kNs, kMiB, 0, false, 4},
      {"parse", "memory_body_64m", kNs, 64 * kMiB, 0, false, 1},
      {"parse", "line_ends_1m", kNs, kMiB, 0, false, 4},
      {"parse", "line_ends_16m", kNs, 16 * kMiB, 0, false, 1},
      {"body", "body_1m", kNs, kMiB, 0, false, 0},
      {"body", "body_64m", kNs, 64 * kMiB, 0, false, 0},
      {"body", "body_chunked_1m", kNs, kMiB, 0, false, 0},
      {"body", "body_chunked_64m", kNs, 64 * kMiB, 0, false, 0},
      {"body", "pieces_64m", kNs, 64 * kMiB, 0, false, 0},
      {"tls", "tls_get", kNs, 0, 0, false, 0},
      {"tls", "tls_body_16m", kNs, 16 * kMiB, 0, false, 0},
      {"upload", "upload_256m", kNs, 256 * kMiB, 1, false, 0},
      {"upload", "upload_memory", Unit::kBytes, 0, 1, true, 0},
      {"encoding", "url_encode_64", kNs, 64, 0, false, 1000},
      {"encoding", "url_encode_4k", kNs, 4 * kKiB, 0, false, 100},
      {"encoding", "base64_32", kNs, 32, 0, false, 1000},
      {"encoding", "base64_4k", kNs, 4 * kKiB, 0, false, 100},
      {"idle", "idle_64", Unit::kBytes, 0, 64, true, 0},
      {"idle", "idle_1000", Unit::kBytes, 0, 1000, true, 0},
      {"load", "load", kNs, 0, 1, false, 0},
  };
  return works;
}

double TimedContender::Measure(int count) {
  const auto start = std::chrono::steady_clock::now();
  Run(count);
  const auto end = std::chrono::steady_clock::now();
  return std::chrono::duration<double, std::nano>(end - start).count() / count;
}

void Registry::Add(const std::string& work, const std::string& contender, Maker make) {
  const auto& works = AllWorks();
  const bool known = std::any_of(works.begin(), works.end(),
                                 [&](const Work& candidate) { return work == candidate.name; });
  Expect(known, work.c_str(), "is no work");
  RankOf(contender);
  m_entries.push_back({work, {contender, std::move(make)}});
}

void Registry::AddTimed(const std::string& work, const std::string& contender,
                        std::function<void(int count)> operation) {
  class Operation : public TimedContender {
   public:
    explicit Operation(std::function<void(int)> run) : m_run(std::move(run)) {}

   private:
    void Run(int count) override { m_run(count); }
    const std::function<void(int)> m_run;
  };
  Add(work, contender, [operation] { return std::make_unique<Operation>(operation); });
}

std::vector<Registry::Entry> Registry::Of(const std::string& work) const {
  std::vector<Entry> entries;
  for (const Registered& registered : m_entries) {
    if (registered.work == work) entries.push_back(registered.entry);
  }
  std::sort(entries.begin(), entries.end(), [](const Entry& a, const Entry& b) {
    return RankOf(a.contender) < RankOf(b.contender);
  });
  return entries;
}

std::vector<std::string> Registry::LeftOut() const {
  std::vector<std::string> names;
  for (const char* contender : kContenders) {
    const bool does = std::any_of(
        m_entries.begin(), m_entries.end(),
        [&](const Registered& registered) { return registered.entry.contender == contender; });
    if (!does) names.emplace_back(contender);
  }
  return names;
}

Family::Family(void (*add)(Registry*)) {
  add(MutableRegistry());
}

const Registry& AllContenders() {
  return *MutableRegistry();
}
