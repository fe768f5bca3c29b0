// The names of categories and levels.
#include "tarnwick/log/log_names.h"

#include <atomic>
#include <memory>
#include <new>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unloading.h"

using namespace tarnwick;

namespace {

// In the order of the values. The tags are those of the product's modules.
constexpr const char* kCategNames[] = {
    "account",      "account-api", "archive",    "archived",      "audio",      "audio-lib",
    "backup",       "backupd",     "camera",     "camera-api",    "camera-cfg", "camera-lib",
    "camera-utils", "camerad",     "config",     "config-lib",    "database",   "database-lib",
    "device",       "device-api",  "discovery",  "discoveryd",    "event",      "event-api",
    "eventd",       "export",      "http",       "image",         "image-lib",  "ioport",
    "ioport-api",   "joystick",    "layout",     "layout-api",    "license",    "license-api",
    "live",         "live-api",    "lived",      "map",           "map-api",    "motion",
    "motion-lib",   "motiond",     "network",    "network-utils", "notify",     "notify-cfg",
    "notifyd",      "player",      "preset",     "ptz",           "ptz-api",    "record",
    "record-api",   "recordd",     "rtsp",       "socket",        "storage",    "storage-api",
    "storage-lib",  "stream",      "stream_mux", "streamd",       "task",       "timeline",
    "utils",        "web",         "web-api",    "snapshot",      "bookmark",   "failover",
    "failoverd",    "share_lib",
};
static_assert(sizeof(kCategNames) / sizeof(kCategNames[0]) == LOG_CATEG_COUNT,
              "each category has one tag");

constexpr const char* kLevelNames[] = {
    "alarm", "error", "warn", "notice", "info", "debug", "debug2", "debug3",
};

template <typename T, size_t N>
void FillNames(const char* const (&names)[N], std::map<T, const char*>* map) {
  int value = 0;
  for (const char* name : names) (*map)[static_cast<T>(value++)] = name;
}

// The maps of the process. They are not static objects: those are destroyed by exit(), while other
// threads may still log, and one that is being built at a fork stays so in the child.
template <typename T>
std::atomic<const TWEnum2StrMap<T>*> g_names{nullptr};

template <typename T>
const char* NameWithoutException(T value) {
  try {
    return Enum2String(value);
  } catch (const std::bad_alloc&) {
    return "unknown";
  }
}

template <typename T>
void Release() {
  delete g_names<T>.exchange(nullptr);
}

__attribute__((destructor)) void ReleaseNames() {
  if (!IsBeingUnloaded()) return;
  Release<LOG_CATEG>();
  Release<LOG_LEVEL>();
}

}  // namespace

template <>
TWEnum2StrMap<LOG_CATEG>::TWEnum2StrMap() {
  FillNames(kCategNames, this);
}
template <>
TWEnum2StrMap<LOG_CATEG>::~TWEnum2StrMap() = default;

template <>
TWEnum2StrMap<LOG_LEVEL>::TWEnum2StrMap() {
  FillNames(kLevelNames, this);
}
template <>
TWEnum2StrMap<LOG_LEVEL>::~TWEnum2StrMap() = default;

namespace tarnwick {

// Of several first callers each builds a map, and the first to finish gives it to all.
template <typename T>
const TWEnum2StrMap<T>& NameMap() {
  const TWEnum2StrMap<T>* names = g_names<T>.load(std::memory_order_acquire);
  if (names != nullptr) return *names;
  auto built = std::make_unique<const TWEnum2StrMap<T>>();
  if (!g_names<T>.compare_exchange_strong(names, built.get())) return *names;
  return *built.release();
}
template const TWEnum2StrMap<LOG_CATEG>& NameMap<LOG_CATEG>();
template const TWEnum2StrMap<LOG_LEVEL>& NameMap<LOG_LEVEL>();

template <typename T>
const char* FindName(const std::map<T, const char*>& names, T value) {
  const auto found = names.find(value);
  return found == names.end() ? "unknown" : found->second;
}
template const char* FindName(const std::map<LOG_CATEG, const char*>& names, LOG_CATEG value);
template const char* FindName(const std::map<LOG_LEVEL, const char*>& names, LOG_LEVEL value);

}  // namespace tarnwick

template <>
const char* Enum2String<LOG_CATEG>(LOG_CATEG value) {
  return FindName(NameMap<LOG_CATEG>(), value);
}

template <>
const char* Enum2String<LOG_LEVEL>(LOG_LEVEL value) {
  return FindName(NameMap<LOG_LEVEL>(), value);
}

const char* TWLogName(LOG_CATEG value) noexcept {
  return NameWithoutException(value);
}

const char* TWLogName(LOG_LEVEL value) noexcept {
  return NameWithoutException(value);
}
