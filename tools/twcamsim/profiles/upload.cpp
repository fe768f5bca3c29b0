// Takes clips of any length and counts their bytes.
#include <fmt/format.h>

#include "tools/twcamsim/profile.h"
#include "tools/twcamsim/upload_counter.h"

namespace {

class UploadSink : public Profile {
 public:
  explicit UploadSink(uint64_t most) : most_(most) {}

  bool TakesStream(const Request& request) const override {
    return request.method == "POST" || request.method == "PUT";
  }

  Response Respond(const Exchange& exchange) override {
    if (!exchange.source) return MakeResponse(405, "text/plain", "POST a clip\n");
    if (exchange.request.Length() == 0) return MakeResponse(200, "text/plain", "0 full\n");
    const UploadCount count = CountUpload(exchange.request, most_, *exchange.source);
    return MakeResponse(200, "text/plain", fmt::format("{} {}\n", count.bytes, count.end));
  }

 private:
  const uint64_t most_;
};

std::unique_ptr<Profile> MakeSink(const ProfileOptions& options, std::string* error) {
  int64_t most = 0;
  if (!NumberOption(options, "after", 0, int64_t{1} << 40, &most, error)) return nullptr;
  return std::make_unique<UploadSink>(static_cast<uint64_t>(most));
}

}  // namespace

ProfileType UploadProfile() {
  return {
      "upload",
      "none",
      "takes a streamed upload at any path, whatever length it announces, and responds with its "
      "count of bytes when the closing boundary came, or the peer closed its direction",
      {{"after", "BYTES", "responds after so many bytes at the latest"}},
      MakeSink};
}
