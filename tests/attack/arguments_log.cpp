// Calls of twdebuglog.h.
#include <sys/shm.h>

#include <cerrno>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tests/attack/arguments_calls.h"
#include "tests/support/files.h"

namespace {

constexpr char kSettings[] = "/var/packages/Tarnwick/etc/settings.conf";

LOG_CATEG Category(Draw& draw) {
  return static_cast<LOG_CATEG>(draw.Int());
}

LOG_LEVEL Level(Draw& draw) {
  return static_cast<LOG_LEVEL>(draw.Int());
}

// A name of a category from 0 to `count` - 1, "unknown" for any other value.
void ExpectName(Ground& ground, const char* name, int value, int count) {
  const bool known = value >= 0 && value < count;
  ground.Expect(name != nullptr && (strcmp(name, "unknown") == 0) != known, "a wrong name");
}

void WriteSettings(Draw& draw) {
  WriteFile(kSettings, draw.Bool() ? "tw_dbglog_settings=\"" + draw.Text() +
                                         "\"\ntw_dbglog_time_scale=\"" + draw.Text() + "\"\n"
                                   : draw.Text());
}

void ExpectStatus(Ground& ground, int result) {
  ground.Expect(result == 0 || result == -1, "neither 0 nor -1");
}

void NameOfCategory(Ground& ground, Draw& draw) {
  const int value = draw.Int();
  ExpectName(ground, Enum2String(static_cast<LOG_CATEG>(value)), value, LOG_CATEG_COUNT);
}

void NameOfLevel(Ground& ground, Draw& draw) {
  const int value = draw.Int();
  ExpectName(ground, Enum2String(static_cast<LOG_LEVEL>(value)), value, 8);
}

void LogNameOfCategory(Ground& ground, Draw& draw) {
  const int value = draw.Int();
  ExpectName(ground, TWLogName(static_cast<LOG_CATEG>(value)), value, LOG_CATEG_COUNT);
}

void LogNameOfLevel(Ground& ground, Draw& draw) {
  const int value = draw.Int();
  ExpectName(ground, TWLogName(static_cast<LOG_LEVEL>(value)), value, 8);
}

template <typename T>
void MakeNames(Ground& ground, Draw& draw) {
  const TWEnum2StrMap<T> names;
  ground.Expect(names.count(static_cast<T>(draw.Below(8))) == 1, "a name is missing");
}

void Init(Ground& ground, Draw& draw) {
  WriteSettings(draw);
  TWDbgLogCfg record;
  ExpectStatus(ground, record.Init(draw.Int()));
}

void Load(Ground& ground, Draw& draw) {
  WriteSettings(draw);
  TWDbgLogCfg record;
  memset(static_cast<void*>(&record), static_cast<int>(draw.Below(256)), sizeof(record));
  ExpectStatus(ground, record.LoadDbgLogSettings());
}

void Save(Ground& ground, Draw& draw) {
  if (draw.OneIn(4)) WriteSettings(draw);
  TWDbgLogCfg record;
  memset(static_cast<void*>(&record), static_cast<int>(draw.Below(256)), sizeof(record));
  ExpectStatus(ground, record.SaveDbgLogSettings());
}

void SetLevel(Ground& ground, Draw& draw) {
  TWDbgLogCfg record = {};
  const LOG_CATEG categ = Category(draw);
  const int level = draw.Int();
  record.SetLevel(categ, level);
  const bool known = categ >= 0 && categ < LOG_CATEG_COUNT;
  ground.Expect(record.Level(categ) == (known ? level : LOG_LEVEL_NOTICE), "another level");
}

// Of the shared record, as a daemon that changes it does.
void SetSharedLevel(Ground& /*ground*/, Draw& draw) {
  if (g_pDbgLogCfg != nullptr) g_pDbgLogCfg->SetLevel(Category(draw), draw.Int());
}

void SetTimeScale(Ground& ground, Draw& draw) {
  TWDbgLogCfg record = {};
  const bool milliseconds = draw.Bool();
  record.SetTimeScale(milliseconds);
  ground.Expect(record.TimeScale() == milliseconds, "another time scale");
}

// The flag is a byte that another process may set to anything.
void TimeScale(Ground& ground, Draw& draw) {
  TWDbgLogCfg record;
  const int byte = static_cast<int>(draw.Below(256));
  memset(static_cast<void*>(&record), byte, sizeof(record));
  ground.Expect(record.TimeScale() == (byte != 0), "another time scale");
}

void Key(Ground& ground, Draw& /*draw*/) {
  ground.Expect(TWShmDbgLogIPCKey() == 0x18180004, "another key");
}

void Attach(Ground& /*ground*/, Draw& /*draw*/) {
  const TWDbgLogCfg* record = TWShmDbgLogCfgAt();
  if (record != nullptr) shmdt(record);
}

// InitDbgCfg does not detach what is attached.
void InitShared(Ground& /*ground*/, Draw& /*draw*/) {
  const TWDbgLogCfg* before = g_pDbgLogCfg;
  InitDbgCfg();
  if (before != nullptr && before != g_pDbgLogCfg) shmdt(before);
}

void FreeShared(Ground& ground, Draw& draw) {
  FreeDbgCfg();
  if (draw.Bool()) FreeDbgCfg();
  ground.Expect(g_pDbgLogCfg == nullptr, "still attached");
}

void Print(Ground& ground, Draw& draw) {
  const LOG_TYPE type = draw.OneIn(4) ? static_cast<LOG_TYPE>(draw.Int()) : LOG_TYPE_MAIN;
  const char* categ = draw.CTextOrNull();
  const char* level = draw.CTextOrNull();
  errno = draw.Int();
  const int before = errno;
  TWPrintf(type, categ, level, draw.CText(), draw.Int(), draw.CText(), "%s [%d] %%\n", draw.CText(),
           draw.Int());
  ground.Expect(errno == before, "errno changed");
}

void Macro(Ground& ground, Draw& draw) {
  const char* text = draw.CText();
  const LOG_CATEG categ = Category(draw);
  errno = draw.Int();
  const int before = errno;
  TW_LOG(categ, Level(draw), "%s\n", text);
  ground.Expect(errno == before, "errno changed");
}

void Enabled(Ground& ground, Draw& draw) {
  if (g_pDbgLogCfg != nullptr) return;
  const LOG_LEVEL level = Level(draw);
  ground.Expect(TWLogEnabled(Category(draw), level) == (level <= LOG_LEVEL_NOTICE), "another gate");
}

void BaseName(Ground& ground, Draw& draw) {
  const std::string& path = draw.Text();
  const std::string name = GetFileBaseName(path);
  const bool is_end =
      path.size() >= name.size() && path.compare(path.size() - name.size(), name.size(), name) == 0;
  ground.Expect(is_end && name.find_first_of("/\\") == std::string::npos, "no base name");
}

}  // namespace

std::vector<PublicCall> LogCalls() {
  return {
      {"char const* Enum2String<LOG_CATEG>", NameOfCategory},
      {"char const* Enum2String<LOG_LEVEL>", NameOfLevel},
      {"TWLogName", LogNameOfCategory},
      {"TWLogName", LogNameOfLevel},
      {"TWEnum2StrMap<LOG_CATEG>::TWEnum2StrMap", MakeNames<LOG_CATEG>},
      {"TWEnum2StrMap<LOG_CATEG>::~TWEnum2StrMap", MakeNames<LOG_CATEG>},
      {"TWEnum2StrMap<LOG_LEVEL>::TWEnum2StrMap", MakeNames<LOG_LEVEL>},
      {"TWEnum2StrMap<LOG_LEVEL>::~TWEnum2StrMap", MakeNames<LOG_LEVEL>},
      {"TWDbgLogCfg::Init", Init},
      {"TWDbgLogCfg::LoadDbgLogSettings", Load},
      {"TWDbgLogCfg::SaveDbgLogSettings", Save},
      {"TWDbgLogCfg::SetLevel", SetLevel},
      {"TWDbgLogCfg::Level", SetSharedLevel},
      {"TWDbgLogCfg::SetTimeScale", SetTimeScale},
      {"TWDbgLogCfg::TimeScale", TimeScale},
      {"TWShmDbgLogIPCKey", Key},
      {"TWShmDbgLogCfgAt", Attach},
      {"InitDbgCfg", InitShared},
      {"FreeDbgCfg", FreeShared},
      {"TWPrintf", Print},
      {"TW_LOG", Macro},
      {"TWLogEnabled", Enabled},
      {"GetFileBaseName", BaseName},
  };
}
