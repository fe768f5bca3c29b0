// Small helpers for files in tests.
#ifndef TARNWICK_TESTS_SUPPORT_FILES_H_
#define TARNWICK_TESTS_SUPPORT_FILES_H_

#include <string>
#include <vector>

// The whole content; an empty text when the file cannot be read.
std::string ReadFile(const std::string& path);

// Replaces the content; fails the test when that does not work.
void WriteFile(const std::string& path, const std::string& content);

bool FileExists(const std::string& path);

// The names in a directory without "." and "..", sorted.
std::vector<std::string> ListFolder(const std::string& path);

// A new empty directory that goes away with the object, with all that it holds.
class TempDir {
 public:
  TempDir();
  ~TempDir();
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;

  const std::string& Path() const { return path_; }

  // The path of an entry `name` in it.
  std::string File(const std::string& name) const { return path_ + "/" + name; }

 private:
  std::string path_;
};

#endif  // TARNWICK_TESTS_SUPPORT_FILES_H_
