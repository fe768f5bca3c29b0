// A picture for each request.
#include <algorithm>
#include <atomic>

#include "tools/twcamsim/picture.h"
#include "tools/twcamsim/profile.h"

namespace {

class Snapshots : public Profile {
 public:
  Snapshots(int columns, int rows) : columns_(columns), rows_(rows) {}

  Response Respond(const Exchange& exchange) override {
    const std::string& path = exchange.request.path;
    if (path != "/" && path != "/snapshot.jpg") {
      return MakeResponse(404, "text/plain", "the picture is /snapshot.jpg\n");
    }
    Response response = MakeResponse(200, "image/jpeg", TestPicture(columns_, rows_, frame_++));
    response.Set("Cache-Control", "no-cache");
    return response;
  }

 private:
  const int columns_;
  const int rows_;
  std::atomic<int> frame_{0};
};

std::unique_ptr<Profile> MakeSnapshots(const ProfileOptions& options, std::string* error) {
  int64_t width = 320, height = 240;
  if (!NumberOption(options, "width", 8, 4096, &width, error) ||
      !NumberOption(options, "height", 8, 4096, &height, error)) {
    return nullptr;
  }
  return std::make_unique<Snapshots>(static_cast<int>(width / 8), static_cast<int>(height / 8));
}

}  // namespace

ProfileType SnapshotProfile() {
  return {"snapshot",
          "none",
          "a JPEG at /snapshot.jpg, another one each time",
          {{"width", "PIXELS", "the picture's width; the default is 320"},
           {"height", "PIXELS", "its height; the default is 240"}},
          MakeSnapshots};
}
