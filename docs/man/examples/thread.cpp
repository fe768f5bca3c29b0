// tarnwick_thread(3) and tarnwick_delay(3): a thread that works at a fixed rate.
#include <atomic>

#include "docs/man/examples/examples.h"
#include "tarnwick/utils/utils.h"

namespace {

std::atomic<int> g_frames{0};

void* GrabFrames(void* /*unused*/) {
  DelayTimer timer(40000);  // 25 frames a second
  while (g_frames < 3) {
    ++g_frames;
    timer.Delay();
  }
  return nullptr;
}

}  // namespace

int GrabThreeFrames() {
  pthread_t thread;
  if (CreateThread(GrabFrames, nullptr, 128 << 10, 0, &thread) == 0) return -1;
  pthread_join(thread, nullptr);
  return g_frames;
}

bool SendPicture(int fd, const std::string& picture) {
  const int size = static_cast<int>(picture.size());
  return WriteFd(fd, picture.data(), size) == size;
}
