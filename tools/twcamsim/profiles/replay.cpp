// Plays back what was recorded: the n-th response to the n-th request, with its delays.
#include <algorithm>
#include <atomic>

#include "tools/common/recording.h"
#include "tools/twcamsim/profile.h"
#include "tools/twcamsim/upload_counter.h"

namespace {

using std::chrono::milliseconds;

constexpr int64_t kLargeBody = 64 << 20;  // nobody keeps more than that

void AddWait(int64_t ms, Steps* steps) {
  if (ms > 0) steps->push_back({Action::kPause, Part::kBody, "", milliseconds(ms)});
}

void AddEnd(const RecordedExchange& exchange, Steps* steps) {
  const auto add = [steps](Action action) { steps->push_back({action, Part::kBody, "", {}}); };
  if (exchange.end == "kept") return;
  AddWait(exchange.end_delay_ms, steps);
  if (exchange.end == "close" || exchange.end == "tls") add(Action::kClose);
  if (exchange.end == "reset" || exchange.end == "refused") add(Action::kReset);
  if (exchange.end == "silent" || exchange.end == "unreachable") add(Action::kStall);
}

Steps StepsOf(const RecordedExchange& exchange) {
  Steps steps;
  size_t at = 0;
  for (const RecordedPiece& piece : exchange.pieces) {
    AddWait(piece.delay_ms, &steps);
    steps.push_back({Action::kSend, Part::kBody, exchange.response.substr(at, piece.bytes), {}});
    at += piece.bytes;
  }
  AddEnd(exchange, &steps);
  return steps;
}

class Recording : public Profile {
 public:
  explicit Recording(std::vector<RecordedExchange> exchanges) : exchanges_(std::move(exchanges)) {}

  bool TakesStream(const Request& request) const override { return request.Length() > kLargeBody; }

  bool WantsTls() const override { return exchanges_[0].tls; }

  // Without a connection there was nothing to respond to; the endpoint then has none either.
  std::string OwnFault() const override {
    const std::string& end = exchanges_[0].end;
    if (!std::all_of(exchanges_.begin(), exchanges_.end(),
                     [&](const RecordedExchange& exchange) { return exchange.end == end; })) {
      return "";
    }
    if (end == "refused") return "refuse";
    if (end == "unreachable") return "black-hole";
    return end == "tls" ? "tls-close" : "";
  }

  Response Respond(const Exchange& exchange) override {
    if (exchange.source) CountUpload(exchange.request, 0, *exchange.source);
    Response response;
    response.raw = true;
    response.steps = StepsOf(exchanges_[next_++ % exchanges_.size()]);
    return response;
  }

 private:
  const std::vector<RecordedExchange> exchanges_;
  std::atomic<size_t> next_{0};
};

std::unique_ptr<Profile> MakeRecording(const ProfileOptions& options, std::string* error) {
  const auto found = options.find("dir");
  if (found == options.end()) {
    *error = "dir=DIR is missing: the directory of the recording";
    return nullptr;
  }
  std::vector<RecordedExchange> exchanges;
  if (!ReadRecording(found->second, &exchanges, error)) return nullptr;
  if (exchanges.empty()) {
    *error = found->second + " holds no exchange";
    return nullptr;
  }
  return std::make_unique<Recording>(std::move(exchanges));
}

}  // namespace

ProfileType ReplayProfile() {
  return {
      "replay",
      "none",
      "plays a recording of twhttp --record back: the n-th response to the n-th request, whatever "
      "it asks, with its delays",
      {{"dir", "DIR", "the directory of the recording"}},
      MakeRecording};
}
