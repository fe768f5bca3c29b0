// Settings that cannot be written: no space, no permission.
#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>

#include "tests/stress/processes.h"
#include "tests/stress/settings_lines.h"
#include "tests/support/files.h"

namespace {

constexpr int kWritten = 0;
constexpr int kRefused = 1;
constexpr double kSeconds = 30;

// The file must be as it was after a refusal, and show round 1 of writer 0 after a success.
void ExpectResult(int outcome, const struct stat& before, CaseResult& result) {
  Rounds rounds = {};
  if (outcome == kWritten) rounds[0] = 1;
  result.Checked(1);
  result.Expect(outcome == kWritten || outcome == kRefused,
                "the writer ended with " + std::to_string(outcome));
  result.Expect(ReadFile(kSettingsFile) == SettingsTextOf(rounds), "another text");
  ExpectGoodSettings(before, result);
}

// Takes the file system's space but for `pages`.
void FillLeaving(int pages) {
  const std::vector<char> page(4096, 'b');
  const int fd = open("/var/packages/Tarnwick/etc/filler", O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  off_t size = 0;
  while (write(fd, page.data(), page.size()) == static_cast<ssize_t>(page.size())) size += 4096;
  if (ftruncate(fd, size > pages * 4096 ? size - pages * 4096 : 0) != 0) perror("ftruncate");
  close(fd);
}

void NoSpace(CaseResult& result) {
  constexpr int kMostPages = 8;
  int outcomes[2] = {};
  for (int pages = 0; pages <= kMostPages; ++pages) {
    if (mount("tmpfs", kSettingsFolder, "tmpfs", 0, "size=256k,mode=755") != 0) {
      return result.Fail("no file system");
    }
    const struct stat before = MakeSettingsFile();
    FillLeaving(pages);
    const int outcome = WriteRound(0, 1) == 0 ? kWritten : kRefused;
    ++outcomes[outcome];
    unlink("/var/packages/Tarnwick/etc/filler");
    ExpectResult(outcome, before, result);
    result.Expect(WriteRound(0, 1) == 0, "no write with new space");
    ExpectResult(kWritten, before, result);
    umount(kSettingsFolder);
  }
  result.Done("0 to %d free pages: %d times refused, %d times written", kMostPages,
              outcomes[kRefused], outcomes[kWritten]);
  result.Expect(outcomes[kRefused] > 0 && outcomes[kWritten] > 0, "one of the two never came");
}

void NoInode(CaseResult& result) {
  if (mount("tmpfs", kSettingsFolder, "tmpfs", 0, "nr_inodes=2,mode=755") != 0) {
    return result.Fail("no file system");
  }
  const struct stat before = MakeSettingsFile();
  result.Expect(WriteRound(0, 1) != 0, "written without a second file");
  ExpectResult(kRefused, before, result);
  result.Done("a file system that holds one file");
}

struct Obstacle {
  const char* name;
  std::function<void()> make;   // on the file and folder, as root
  std::function<bool()> enter;  // in the writing process
  int outcome;
};

// A process without capabilities meets permissions although it is root.
const std::vector<Obstacle>& Obstacles() {
  static const std::vector<Obstacle> obstacles = {
      {"folder without write permission", [] { chmod(kSettingsFolder, 0555); }, DropCapabilities,
       kRefused},
      {"file that may not be read", [] { chmod(kSettingsFile, 0); }, DropCapabilities, kRefused},
      {"file that may not be written",
       [] {
         if (chown(kSettingsFile, 0, 0) == 0) chmod(kSettingsFile, 0444);
       },
       DropCapabilities, kWritten},
      {"read-only file system",
       [] { mount(nullptr, kSettingsFolder, nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr); },
       [] { return true; }, kRefused},
  };
  return obstacles;
}

// Those that need a second user, which a user namespace may not have.
const std::vector<Obstacle>& HindrancesOfOthers() {
  static const std::vector<Obstacle> obstacles = {
      {"file of another user", [] { chmod(kSettingsFile, 0644); }, DropCapabilities, kRefused},
      {"another user in root's folder", [] { chmod(kSettingsFile, 0644); },
       [] { return setgid(2345) == 0 && setuid(1234) == 0; }, kRefused},
      {"the file's owner in its own folder",
       [] {
         if (chown(kSettingsFolder, 1234, 2345) != 0) perror("chown");
       },
       [] { return setgid(2345) == 0 && setuid(1234) == 0; }, kWritten},
  };
  return obstacles;
}

void Hinder(const Obstacle& obstacle, CaseResult& result) {
  if (mount("tmpfs", kSettingsFolder, "tmpfs", 0, "mode=755") != 0) {
    return result.Fail("no file system");
  }
  MakeSettingsFile();
  obstacle.make();
  struct stat before = {};
  stat(kSettingsFile, &before);
  const pid_t pid = Spawn([&] {
    if (!obstacle.enter()) return 9;
    return WriteRound(0, 1) == 0 ? kWritten : kRefused;
  });
  const auto status = WaitFor(pid, kSeconds);
  result.Expect(status == obstacle.outcome << 8,
                std::string(obstacle.name) + ": " + StatusText(status));
  ExpectResult(obstacle.outcome, before, result);
  umount(kSettingsFolder);
}

void NoPermission(CaseResult& result) {
  const bool others = MakeSettingsFile().st_uid == 1234;
  for (const Obstacle& obstacle : Obstacles()) Hinder(obstacle, result);
  if (others) {
    for (const Obstacle& obstacle : HindrancesOfOthers()) Hinder(obstacle, result);
  }
  result.Done("%zu obstacles%s", Obstacles().size() + (others ? HindrancesOfOthers().size() : 0),
              others ? "" : " (no second user here)");
}

}  // namespace

std::vector<StressCase> SettingsFaultCases() {
  return {
      {"settings", "no space", NoSpace},
      {"settings", "no second file", NoInode},
      {"settings", "no permission", NoPermission},
  };
}
