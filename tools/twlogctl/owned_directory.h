#ifndef TARNWICK_TOOLS_TWLOGCTL_OWNED_DIRECTORY_H_
#define TARNWICK_TOOLS_TWLOGCTL_OWNED_DIRECTORY_H_

#include <dirent.h>

#include <memory>

struct DirectoryCloser {
  void operator()(DIR* directory) const { closedir(directory); }
};
// A directory that is being read.
using OwnedDirectory = std::unique_ptr<DIR, DirectoryCloser>;

#endif  // TARNWICK_TOOLS_TWLOGCTL_OWNED_DIRECTORY_H_
