#ifndef TARNWICK_TOOLS_TWLOGCTL_OWNED_FOLDER_H_
#define TARNWICK_TOOLS_TWLOGCTL_OWNED_FOLDER_H_

#include <dirent.h>

#include <memory>

struct FolderCloser {
  void operator()(DIR* folder) const { closedir(folder); }
};
// A folder that is being read.
using OwnedFolder = std::unique_ptr<DIR, FolderCloser>;

#endif  // TARNWICK_TOOLS_TWLOGCTL_OWNED_FOLDER_H_
