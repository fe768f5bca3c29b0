// What may stand at a path where the library expects a regular file or a directory of its own.
#ifndef TARNWICK_TESTS_SUPPORT_PLANTED_H_
#define TARNWICK_TESTS_SUPPORT_PLANTED_H_

#include <ostream>
#include <string>
#include <vector>

struct PlantedKind {
  const char* name;
  // Makes it at `path`; links lead to `target`, a regular file of the same file system.
  // Results: false where this process may not make such a thing.
  bool (*plant)(const std::string& path, const std::string& target);
  int below;  // the errno of opening a file below it, as if it were a directory
};

inline std::ostream& operator<<(std::ostream& out, const PlantedKind& kind) {
  return out << kind.name;
}

// All kinds but a directory.
const std::vector<PlantedKind>& PlantedKinds();

#endif  // TARNWICK_TESTS_SUPPORT_PLANTED_H_
