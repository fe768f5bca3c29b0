// Live pictures: a body of JPEGs that does not end (multipart/x-mixed-replace).
#include <fmt/format.h>

#include "tools/twcamsim/picture.h"
#include "tools/twcamsim/profile.h"

namespace {

constexpr char kBoundary[] = "camera-frame";

std::string FramePart(int frame) {
  const std::string picture = TestPicture(40, 30, frame);
  return fmt::format("--{}\r\nContent-Type: image/jpeg\r\nContent-Length: {}\r\n\r\n{}\r\n",
                     kBoundary, picture.size(), picture);
}

class LivePictures : public Profile {
 public:
  LivePictures(int64_t rate, int64_t count) : rate_(rate), count_(count) {}

  Response Respond(const Exchange& exchange) override {
    const std::string& path = exchange.request.path;
    if (path != "/" && path != "/live.mjpg") {
      return MakeResponse(404, "text/plain", "the pictures are /live.mjpg\n");
    }
    Response response =
        MakeResponse(200, fmt::format("multipart/x-mixed-replace; boundary={}", kBoundary), "");
    response.interval = std::chrono::milliseconds(1000 / rate_);
    response.more = [frame = 0, most = count_](std::string* piece) mutable {
      if (most > 0 && frame >= most) return false;
      *piece = FramePart(frame++);
      if (frame == most) *piece += fmt::format("--{}--\r\n", kBoundary);
      return true;
    };
    return response;
  }

 private:
  const int64_t rate_;
  const int64_t count_;
};

std::unique_ptr<Profile> MakePictures(const ProfileOptions& options, std::string* error) {
  int64_t rate = 5, count = 0;
  if (!NumberOption(options, "rate", 1, 1000, &rate, error) ||
      !NumberOption(options, "frames", 0, 1 << 30, &count, error)) {
    return nullptr;
  }
  return std::make_unique<LivePictures>(rate, count);
}

}  // namespace

ProfileType MultipartProfile() {
  return {"multipart",
          "none",
          "JPEGs without an end at /live.mjpg (multipart/x-mixed-replace)",
          {{"rate", "COUNT", "pictures a second; the default is 5"},
           {"frames", "COUNT", "ends after so many; the default, 0, is never"}},
          MakePictures};
}
