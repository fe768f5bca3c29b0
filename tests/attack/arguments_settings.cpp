// Calls of qlibcfile.h, twrequestscope.h and version.h.
#include <cerrno>
#include <cstring>

#include "tarnwick/platform/qlibcfile.h"
#include "tarnwick/version.h"
#include "tests/attack/arguments_calls.h"

namespace {

const char* Key(Draw& draw) {
  return draw.Bool() ? "name" : draw.CTextOrNull();
}

const char* Format(Draw& draw) {
  constexpr const char* kFormats[] = {"%s=\"%s\"\n", "%s=%s\n", "%s%s", "%s",
                                      "%s%s%s",      "%s=%n%s", "%d%s", "%%%s=%s%%\n"};
  if (draw.OneIn(3)) return draw.CTextOrNull();
  return kFormats[draw.Below(std::size(kFormats))];
}

void Get(Ground& ground, Draw& draw) {
  const char* path = ground.SettingsPath();
  const int size = static_cast<int>(draw.Size());
  const std::unique_ptr<char[]> value(new char[static_cast<size_t>(size)]);
  const char* key = Key(draw);
  if (draw.OneIn(8)) {
    ground.Expect(QLIBCFileGetKeyValue(path, key, nullptr, size, draw.Int()) == -1, "not refused");
    ground.Expect(QLIBCFileGetKeyValue(path, key, value.get(), -1, draw.Int()) == -1,
                  "not refused");
    return;
  }
  const int result = QLIBCFileGetKeyValue(path, key, value.get(), size, draw.Int());
  ground.Expect(result >= -1, "less than -1");
  if (result == -1) return;
  const size_t stored = strlen(value.get());
  ground.Expect(stored <= static_cast<size_t>(result), "more than there is");
}

void Set(Ground& ground, Draw& draw) {
  const char* value = draw.CTextOrNull();
  const char* key = Key(draw);
  const char* path = ground.SettingsPath();
  errno = 0;
  const int result = QLIBCFileSetKeyValue(path, key, value, Format(draw));
  ground.Expect(result == 0 || (result == -1 && errno != 0), "neither 0 nor -1 with errno");
}

void SetAndGet(Ground& ground, Draw& draw) {
  const std::string value = draw.CText();
  const int result = QLIBCFileSetKeyValue("conf", "name", value.c_str(), "%s=\"%s\"\n");
  if (result != 0) return;
  std::string read(value.size() + 1, 'x');
  const int length =
      QLIBCFileGetKeyValue("conf", "name", &read[0], static_cast<int>(read.size()), 0);
  ground.Expect(length <= static_cast<int>(value.size()), "longer than what was set");
}

void MakeScope(Ground& ground, Draw& /*draw*/) {
  ground.NewScope();
}

void DropScope(Ground& ground, Draw& /*draw*/) {
  ground.Scope();
  ground.DropScope();
}

void Valid(Ground& ground, Draw& /*draw*/) {
  ground.Expect(ground.Scope().Valid(), "without memory");
}

void SetEscapedLog(Ground& ground, Draw& draw) {
  ground.Scope().SetEscapedLog(draw.Bool());
}

void VersionNumber(Ground& ground, Draw& /*draw*/) {
  ground.Expect(TWVersionNumber() == TARNWICK_VERSION_NUMBER, "another version");
}

void Version(Ground& ground, Draw& /*draw*/) {
  ground.Expect(strlen(TWVersion()) >= 5, "no version");
}

}  // namespace

std::vector<PublicCall> SettingsCalls() {
  return {
      {"QLIBCFileGetKeyValue", Get},
      {"QLIBCFileGetKeyValue", SetAndGet},
      {"QLIBCFileSetKeyValue", Set},
      {"TWRequestScope::TWRequestScope", MakeScope},
      {"TWRequestScope::~TWRequestScope", DropScope},
      {"TWRequestScope::Valid", Valid},
      {"TWRequestScope::SetEscapedLog", SetEscapedLog},
      {"TWVersionNumber", VersionNumber},
      {"TWVersion", Version},
  };
}
