#include "tests/support/planted.h"

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>

#include "tests/support/files.h"

namespace {

constexpr uid_t kOther = 65534;
constexpr off_t kSparse = off_t{1} << 30;

using Path = const std::string&;

bool PlantFifo(Path path, Path /*target*/) {
  return mkfifo(path.c_str(), 0666) == 0;
}

bool PlantDevice(Path path, Path /*target*/) {
  return mknod(path.c_str(), S_IFCHR | 0666, makedev(1, 3)) == 0;
}

bool PlantSocket(Path path, Path /*target*/) {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  path.copy(address.sun_path, sizeof(address.sun_path) - 1);
  const bool made = bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0;
  close(fd);
  return made;
}

bool PlantDanglingLink(Path path, Path /*target*/) {
  return symlink("/no/such/folder/file", path.c_str()) == 0;
}

bool PlantCircle(Path path, Path /*target*/) {
  return symlink(path.c_str(), path.c_str()) == 0;
}

bool PlantLinkToADevice(Path path, Path /*target*/) {
  return symlink("/dev/zero", path.c_str()) == 0;
}

bool PlantLinkOfAnother(Path path, Path target) {
  return symlink(target.c_str(), path.c_str()) == 0 && lchown(path.c_str(), kOther, kOther) == 0;
}

bool PlantHardLink(Path path, Path target) {
  return link(target.c_str(), path.c_str()) == 0;
}

bool PlantLargeFile(Path path, Path /*target*/) {
  WriteFile(path, std::string(3u << 20, 'x'));
  return true;
}

bool PlantSparseFile(Path path, Path /*target*/) {
  WriteFile(path, "");
  return truncate(path.c_str(), kSparse) == 0;
}

bool PlantClosedFile(Path path, Path /*target*/) {
  WriteFile(path, "closed\n");
  return chmod(path.c_str(), 0) == 0;
}

}  // namespace

const std::vector<PlantedKind>& PlantedKinds() {
  static const std::vector<PlantedKind> kinds = {
      {"a FIFO", PlantFifo, ENOTDIR},
      {"a device", PlantDevice, ENOTDIR},
      {"a socket", PlantSocket, ENOTDIR},
      {"a dangling link", PlantDanglingLink, ENOENT},
      {"a link in a circle", PlantCircle, ELOOP},
      {"a link to a device", PlantLinkToADevice, ENOTDIR},
      {"a link of another user", PlantLinkOfAnother, ENOTDIR},
      {"a hard link", PlantHardLink, ENOTDIR},
      {"a large file", PlantLargeFile, ENOTDIR},
      {"a sparse file", PlantSparseFile, ENOTDIR},
      {"a file without rights", PlantClosedFile, ENOTDIR},
  };
  return kinds;
}
