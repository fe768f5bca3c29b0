// The text of a settings file. Line 1: words and numbers; line 2: a key; line 3: a value; line 4: a
// format, in which \n stands for a line feed; the rest is the file.
//
// Words of line 1: "list" splits the value at the characters of the key; "levels" loads the record
// of levels from the file; "file" sets the key in a file as well. Its first number is the size of a
// reader's buffer.
#include "tarnwick/platform/settings_text.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cstdarg>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

#include "fuzz/oracle/settings_text.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "tarnwick/log/log_settings.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/qlibcfile.h"

using namespace tarnwick;

namespace {

std::string g_product_settings;  // stands in for the product's own settings file

}  // namespace

extern "C" {

int __real_open64(const char* path, int flags, ...);

int __wrap_open64(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
  va_end(arguments);
  const bool product = path == std::string_view("/var/packages/Tarnwick/etc/settings.conf");
  return __real_open64(product ? g_product_settings.c_str() : path, flags, mode);
}

// The disk is not asked to confirm: thousands of files a second are written here.
int __wrap_fsync(int) {
  return 0;
}

}  // extern "C"

namespace {

constexpr char kUsualFormat[] = "%s=\"%s\"\n";

struct Setting {
  std::string key;
  std::string value;
  std::string format;
  std::string text;
};

std::string UpToZero(std::string_view text) {
  return std::string(text).c_str();
}

std::string WithLineFeeds(std::string text) {
  for (size_t at; (at = text.find("\\n")) != std::string::npos;) text.replace(at, 2, "\n");
  return text;
}

Setting Parse(std::string_view input) {
  Setting setting;
  setting.key = UpToZero(TakeLine(&input));
  setting.value = UpToZero(TakeLine(&input));
  setting.format = WithLineFeeds(UpToZero(TakeLine(&input)));
  setting.text = input;
  return setting;
}

void CheckFind(const std::string& text, const std::string& key) {
  const SettingsLine line = FindSettingsLine(text, key);
  const std::optional<std::string> expected = oracle::ValueOf(text, key);
  ExpectSame("having the key", line.found, expected.has_value());
  if (!expected) return;
  ExpectSame("the value", line.value, *expected);
  const std::string whole = text.substr(line.begin, line.end - line.begin);
  Expect("the line is one line", oracle::LinesOf(whole).size() == 1);
  Expect("the line has the value", oracle::ValueIn(whole, key) == expected);
  Expect("the line begins where one ends", line.begin == 0 || text[line.begin - 1] == '\n');
}

// Replaces the key's line by one in the format, and reads it back.
void CheckReplace(const Setting& s) {
  const std::optional<std::string> expected = oracle::Formatted(s.format, s.key, s.value);
  std::string line;
  ExpectSame("taking the format", FormatSettingsLine(s.format, s.key, s.value, &line),
             expected.has_value());
  if (!expected) return;
  ExpectSame("the line", line, *expected);
  if (line.empty()) return;
  const std::string text = ReplaceSettingsLine(s.text, s.key, line);
  ExpectSame("the text with the line", text, oracle::WithSetting(s.text, s.key, line));
  if (s.format != kUsualFormat || !oracle::CanBeReadBack(s.key, s.value)) return;
  ExpectSame("the value read back", FindSettingsLine(text, s.key).value, s.value);
}

void CheckList(const Setting& s) {
  Expect("the list", SplitToIntList(s.value, s.key) == oracle::IntList(s.value, s.key));
}

// A file in memory, by a path.
class MemoryFile {
 public:
  explicit MemoryFile(const std::string& text) : fd_(memfd_create("settings", 0)) {
    Expect("a file in memory is made", fd_ >= 0);
    const auto size = static_cast<ssize_t>(text.size());
    Expect("it takes the text", pwrite(fd_, text.data(), text.size(), 0) == size);
  }
  ~MemoryFile() { close(fd_); }
  MemoryFile(const MemoryFile&) = delete;
  MemoryFile& operator=(const MemoryFile&) = delete;

  std::string Path() const { return "/proc/self/fd/" + std::to_string(fd_); }

 private:
  int fd_;
};

void CheckGet(const Setting& s, size_t size) {
  const MemoryFile file(s.text);
  const std::unique_ptr<char[]> buffer(new char[size]);  // the sanitizer sees its end
  std::fill_n(buffer.get(), size, '#');
  const int result = QLIBCFileGetKeyValue(file.Path().c_str(), s.key.c_str(), buffer.get(),
                                          static_cast<int>(size), 0);
  if (s.key.empty()) return ExpectSame("reading without a key", result, -1);
  const std::string expected = oracle::ValueOf(s.text, s.key).value_or("");
  ExpectSame("the value's length", result, static_cast<int64_t>(expected.size()));
  const size_t stored = std::min(expected.size(), size - 1);
  ExpectSame("the value in the buffer", std::string_view(buffer.get(), stored),
             expected.substr(0, stored));
  ExpectSame("the zero byte after it", buffer[stored], 0);
}

void CheckLevels(const std::string& text) {
  const MemoryFile file(text);
  g_product_settings = file.Path();
  oracle::Levels expected = {std::vector<int>(LOG_CATEG_COUNT, LOG_LEVEL_NOTICE), false};
  TWDbgLogCfg record;
  const int result = record.Init(0);
  ExpectSame("loading the levels", result, oracle::Load(text, &expected));
  ExpectSame("the flag", record.TimeScale(), expected.milliseconds);
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) {
    ExpectSame("a level", record.Level(static_cast<LOG_CATEG>(i)),
               expected.levels[static_cast<size_t>(i)]);
  }
}

// A directory beside the program, with one file; both go when the program ends.
class Directory {
 public:
  Directory() : name_(std::filesystem::read_symlink("/proc/self/exe").string() + "-XXXXXX") {
    Expect("a directory is made", mkdtemp(name_.data()) != nullptr);
  }
  ~Directory() {
    std::error_code ignored;
    std::filesystem::remove_all(name_, ignored);
  }
  Directory(const Directory&) = delete;
  Directory& operator=(const Directory&) = delete;

  std::string File() const { return name_ + "/conf"; }

 private:
  std::string name_;
};

std::string Contents(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

void CheckSet(const Setting& s) {
  static const Directory directory;
  std::ofstream(directory.File(), std::ios::binary | std::ios::trunc) << s.text;
  const std::optional<std::string> line = oracle::Formatted(s.format, s.key, s.value);
  const bool taken = line && oracle::CanBeReadBack(s.key, s.value);
  const int result = QLIBCFileSetKeyValue(directory.File().c_str(), s.key.c_str(), s.value.c_str(),
                                          s.format.c_str());
  ExpectSame("setting the key", result, taken ? 0 : -1);
  ExpectSame("the file", Contents(directory.File()),
             taken ? oracle::WithSetting(s.text, s.key, *line) : s.text);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view input(reinterpret_cast<const char*>(data), size);
  const Options options(TakeLine(&input));
  const Setting setting = Parse(input);
  if (options.Has("list")) CheckList(setting);
  if (oracle::IsWord(setting.key)) {
    CheckFind(setting.text, setting.key);
    CheckReplace(setting);
  }
  if (!options.Numbers().empty()) CheckGet(setting, options.Numbers()[0]);
  if (options.Has("levels")) CheckLevels(setting.text);
  if (options.Has("file")) CheckSet(setting);
  return 0;
}
