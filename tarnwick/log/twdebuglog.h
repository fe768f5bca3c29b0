// The common debug log: categories and levels, the shared record of levels, the log writer and the
// macro that every log call goes through.
//
// A daemon logs with TW_LOG:
//
//   #define TW_LOG_SOURCE "camerad"  // the source that its log lines name
//   #include "tarnwick/log/twdebuglog.h"
//   ...
//   TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "camera %d does not respond\n", id);
//
// which appends to /var/log/tarnwick/tarnwick.log a line such as
//
//   Mar  5 14:03:09 [812][camera][warn] camerad:57:Probe(): camera 3 does not respond
//
// when the shared record lets the category write at that level. Several files may name one source,
// as the library's own do (all of TWHttpClient is "twhttp"): find a line by its function and
// message.
#ifndef TARNWICK_LOG_TWDEBUGLOG_H_
#define TARNWICK_LOG_TWDEBUGLOG_H_

#include <sys/types.h>

#include <cstdint>
#include <map>
#include <string>

#include "tarnwick/platform/export.h"

// The modules of the product. The numbers are positions in the shared record and in the saved
// settings: a value is never renumbered, and a new one needs a new record layout. The modules stand
// in alphabetical order up to 68; the last five came later.
enum LOG_CATEG : int {
  LOG_CATEG_ACCOUNT = 0,
  LOG_CATEG_ACCOUNT_API = 1,
  LOG_CATEG_ARCHIVE = 2,
  LOG_CATEG_ARCHIVED = 3,
  LOG_CATEG_AUDIO = 4,
  LOG_CATEG_AUDIO_LIB = 5,
  LOG_CATEG_BACKUP = 6,
  LOG_CATEG_BACKUPD = 7,
  LOG_CATEG_CAMERA = 8,
  LOG_CATEG_CAMERA_API = 9,
  LOG_CATEG_CAMERA_CFG = 10,
  LOG_CATEG_CAMERA_LIB = 11,
  LOG_CATEG_CAMERA_UTILS = 12,
  LOG_CATEG_CAMERAD = 13,
  LOG_CATEG_CONFIG = 14,
  LOG_CATEG_CONFIG_LIB = 15,
  LOG_CATEG_DATABASE = 16,
  LOG_CATEG_DATABASE_LIB = 17,
  LOG_CATEG_DEVICE = 18,
  LOG_CATEG_DEVICE_API = 19,
  LOG_CATEG_DISCOVERY = 20,
  LOG_CATEG_DISCOVERYD = 21,
  LOG_CATEG_EVENT = 22,
  LOG_CATEG_EVENT_API = 23,
  LOG_CATEG_EVENTD = 24,
  LOG_CATEG_EXPORT = 25,
  LOG_CATEG_HTTP = 26,
  LOG_CATEG_IMAGE = 27,
  LOG_CATEG_IMAGE_LIB = 28,
  LOG_CATEG_IOPORT = 29,
  LOG_CATEG_IOPORT_API = 30,
  LOG_CATEG_JOYSTICK = 31,
  LOG_CATEG_LAYOUT = 32,
  LOG_CATEG_LAYOUT_API = 33,
  LOG_CATEG_LICENSE = 34,
  LOG_CATEG_LICENSE_API = 35,
  LOG_CATEG_LIVE = 36,
  LOG_CATEG_LIVE_API = 37,
  LOG_CATEG_LIVED = 38,
  LOG_CATEG_MAP = 39,
  LOG_CATEG_MAP_API = 40,
  LOG_CATEG_MOTION = 41,
  LOG_CATEG_MOTION_LIB = 42,
  LOG_CATEG_MOTIOND = 43,
  LOG_CATEG_NETWORK = 44,
  LOG_CATEG_NETWORK_UTILS = 45,
  LOG_CATEG_NOTIFY = 46,
  LOG_CATEG_NOTIFY_CFG = 47,
  LOG_CATEG_NOTIFYD = 48,
  LOG_CATEG_PLAYER = 49,
  LOG_CATEG_PRESET = 50,
  LOG_CATEG_PTZ = 51,
  LOG_CATEG_PTZ_API = 52,
  LOG_CATEG_RECORD = 53,
  LOG_CATEG_RECORD_API = 54,
  LOG_CATEG_RECORDD = 55,
  LOG_CATEG_RTSP = 56,
  LOG_CATEG_SOCKET = 57,
  LOG_CATEG_STORAGE = 58,
  LOG_CATEG_STORAGE_API = 59,
  LOG_CATEG_STORAGE_LIB = 60,
  LOG_CATEG_STREAM = 61,
  LOG_CATEG_STREAM_MUX = 62,
  LOG_CATEG_STREAMD = 63,
  LOG_CATEG_TASK = 64,
  LOG_CATEG_TIMELINE = 65,
  LOG_CATEG_UTILS = 66,
  LOG_CATEG_WEB = 67,
  LOG_CATEG_WEB_API = 68,
  LOG_CATEG_SNAPSHOT = 69,
  LOG_CATEG_BOOKMARK = 70,
  LOG_CATEG_FAILOVER = 71,
  LOG_CATEG_FAILOVERD = 72,
  LOG_CATEG_SHARE_LIB = 73,
};

// How many categories there are, and levels in the record.
constexpr int LOG_CATEG_COUNT = 74;

// How severe a line is; the lower, the more severe.
enum LOG_LEVEL : int {
  LOG_LEVEL_ALARM = 0,
  LOG_LEVEL_ERROR = 1,
  LOG_LEVEL_WARN = 2,
  LOG_LEVEL_NOTICE = 3,  // the default of every category: this and the more severe are written
  LOG_LEVEL_INFO = 4,
  LOG_LEVEL_DEBUG = 5,
  LOG_LEVEL_DEBUG2 = 6,
  LOG_LEVEL_DEBUG3 = 7,
};

// The log file of a line.
enum LOG_TYPE : int {
  LOG_TYPE_MAIN = 0,          // /var/log/tarnwick/tarnwick.log
  LOG_TYPE_NOTIFICATION = 1,  // /var/log/tarnwick/twnotification.log
};

// The names of one enumeration, LOG_CATEG or LOG_LEVEL: the default constructor fills in each name.
// The names are literals that the map does not own. Throws std::bad_alloc when memory runs out.
// Threads: as std::map.
template <typename T>
class TWEnum2StrMap : public std::map<T, const char*> {
 public:
  TWEnum2StrMap();
  ~TWEnum2StrMap();
};

template <>
TARNWICK_API TWEnum2StrMap<LOG_CATEG>::TWEnum2StrMap();
template <>
TARNWICK_API TWEnum2StrMap<LOG_CATEG>::~TWEnum2StrMap();
template <>
TARNWICK_API TWEnum2StrMap<LOG_LEVEL>::TWEnum2StrMap();
template <>
TARNWICK_API TWEnum2StrMap<LOG_LEVEL>::~TWEnum2StrMap();

// The name of a category or a level.
//
// Results: a zero-terminated string that lives as long as the library is loaded; "unknown" for a
//   value outside the enumeration; never null. The first call throws std::bad_alloc when memory
//   runs out.
// Threads: any, also while another thread ends the process.
template <typename T>
const char* Enum2String(T value);

template <>
TARNWICK_API const char* Enum2String<LOG_CATEG>(LOG_CATEG value);
template <>
TARNWICK_API const char* Enum2String<LOG_LEVEL>(LOG_LEVEL value);

// The record of levels that all processes of the product share, byte for byte: the flag at offset
// 0, three reserved bytes, then the 74 levels as 32-bit integers in the host's byte order.
//
// It is a System V shared memory segment, which one process of the product creates before the
// daemons start; the library never does. Nothing here is logged.
// Threads: the record has no lock. Each level is one aligned word, so a reader sees the old or the
//   new level; it may see some levels old and some new while a process changes them.
class TARNWICK_API TWDbgLogCfg {
 public:
  // Sets the flag to false and every level to notice, then calls LoadDbgLogSettings. The argument
  // is ignored.
  // Results: those of LoadDbgLogSettings.
  int Init(int unused);

  // Reads the levels ("tw_dbglog_settings") and the flag ("tw_dbglog_time_scale") from
  // /var/packages/Tarnwick/etc/settings.conf into this record.
  //
  // A shorter list changes the first levels only; numbers after the 74th are ignored; text that is
  // not a number is 0. The flag is set by "yes" exactly, and cleared by any other value.
  // Results: 0; -1 when one of the keys is missing or empty, the file unreadable or memory
  //   short. What is missing stays as it is in the record; the levels are loaded even when the
  //   flag's key is missing. errno after -1 is that of QLIBCFileGetKeyValue; a key that is only
  //   missing leaves it as it was.
  int LoadDbgLogSettings();

  // Writes both keys from this record into the settings file, which is created when missing.
  //
  // Results: 0; -1 when one of the two could not be written (the other may have been), with the
  //   errno of QLIBCFileSetKeyValue.
  // Blocks while another process holds the lock of the settings file or of its directory.
  int SaveDbgLogSettings();

  // True when the time stamps of all log lines have milliseconds; SetTimeScale changes it for all
  // processes at once.
  bool TimeScale() const;
  void SetTimeScale(bool milliseconds);

  // The most verbose level that `categ` writes; SetLevel changes it for all processes at once. For
  // a category outside LOG_CATEG Level returns notice, and SetLevel does nothing.
  int Level(LOG_CATEG categ) const {
    if (categ < 0 || categ >= LOG_CATEG_COUNT) return LOG_LEVEL_NOTICE;
    return __atomic_load_n(&m_levels[categ], __ATOMIC_RELAXED);
  }
  void SetLevel(LOG_CATEG categ, int level);

 private:
  uint8_t m_bTimeScale;  // 0 or 1; a byte, because another process may store any value in it
  uint8_t m_reserved[3];
  int32_t m_levels[LOG_CATEG_COUNT];
};

static_assert(sizeof(TWDbgLogCfg) == 300, "every process of the product shares this layout");

// The attached record, or null when there is none. Set when the library is loaded, cleared when it
// is unloaded; there is no retry in between: a daemon that starts before the record exists logs at
// notice for its whole life.
TARNWICK_API extern TWDbgLogCfg* g_pDbgLogCfg;

// The System V key of the record's segment: 0x18180004.
// Threads: any.
TARNWICK_API key_t TWShmDbgLogIPCKey();

// Attaches the record's segment once more, read-write; never creates it.
// Results: the record, which the caller releases with shmdt(2); null when there is no segment or it
//   may not be attached.
// Threads: any.
TARNWICK_API TWDbgLogCfg* TWShmDbgLogCfgAt();

// Sets g_pDbgLogCfg to TWShmDbgLogCfgAt(). Runs by itself when the library is loaded; a process
// that creates the record itself calls it afterwards. A record that is attached already is not
// detached.
// REQUIRES: no other thread logs.
TARNWICK_API void InitDbgCfg();

// Detaches the record, if there is one, and sets g_pDbgLogCfg to null. Runs by itself when the
// library is unloaded by dlclose. At the end of a process it does not: other threads may still log,
// and the kernel detaches the record.
// REQUIRES: no other thread logs.
TARNWICK_API void FreeDbgCfg();

// Appends one line to a log file. Use TW_LOG, which asks the levels first.
//
// Arguments: `categ` and `level` are the names to print; when either is null neither is printed.
//   `file` is the source's name or path, of which the part after the last "/" or "\\" is printed.
//   `format` is a printf(3) format and ends in "\n" itself.
// The line: time, "[pid]" (or "[pid][thread id]" outside the main thread), "[category][level]",
//   then "file:line:function(): " and the message, as tarnwick.log(5) tells. Milliseconds are
//   printed when the shared record says so.
// Failures: a file that cannot be opened, one that is not regular, a stream that cannot be made for
//   it, and an undefined `type`, are reported to syslog(3) with priority LOG_ERR and the error
//   number: EFAULT for the type, EISDIR for a directory, ENXIO for any other file that is not
//   regular (a FIFO, a device, a terminal or a socket, also at the end of a link, is neither waited
//   for nor written), else that of open(2) or of the stream's allocation. A lock that cannot be had
//   drops the line silently. A full disk and the process's limit on file sizes cut the line or lose
//   it; no SIGXFSZ comes of it. errno is kept.
// Blocks: while another process or thread holds the lock of the file, without a limit, and while
//   the disk takes its time to open it.
// Threads: any thread of any process; lines never mix, because each is written under an exclusive
//   flock(2) of the file.
// Fork: a process may fork at any moment, and the child may log. It has none of the open log files
//   and holds no lock. The fork waits while another thread opens or closes a log file, reads the
//   time zone or reports to the system log, for 100 milliseconds at most. When one of the last two
//   has not ended by then, the child's lines have no time, and it does not report failures: it
//   would wait for ever.
// End of the process: a thread may log while another one calls exit: nothing that a log call reads
//   is destroyed there.
// Cancellation: it is no cancellation point; nor are the functions of the record and the settings.
TARNWICK_API void TWPrintf(LOG_TYPE type, const char* categ, const char* level, const char* file,
                           int line, const char* func, const char* format, ...)
    __attribute__((format(printf, 7, 8)));

// The part of `path` after the last "/" or "\\"; the whole path when it holds neither, and an empty
// string when it ends in one. Throws std::bad_alloc when memory runs out.
// Threads: any.
TARNWICK_API std::string GetFileBaseName(std::string path);

// True when a line of this category and level is to be written: the level is at most the category's
// level in the shared record, or at most notice when no record is attached.
// Threads: any.
inline bool TWLogEnabled(LOG_CATEG categ, LOG_LEVEL level) {
  const TWDbgLogCfg* cfg = g_pDbgLogCfg;
  return level <= (cfg != nullptr ? cfg->Level(categ) : static_cast<int>(LOG_LEVEL_NOTICE));
}

// Enum2String for TW_LOG, which throws nothing: "unknown" also when there is no memory for the
// names, which the first call of a process builds.
// Threads: any.
TARNWICK_API const char* TWLogName(LOG_CATEG value) noexcept;
TARNWICK_API const char* TWLogName(LOG_LEVEL value) noexcept;

// The source that TW_LOG prints. A file defines the macro before its first include; without that
// its path is used, of which the base name is printed.
#ifndef TW_LOG_SOURCE
#define TW_LOG_SOURCE __FILE__
#endif

// TW_LOG(category, level, format, ...) writes a line to the main log when TWLogEnabled says so for
// the LOG_CATEG and the LOG_LEVEL. One statement, safe after `if` and before `else`; while the
// level is off, the arguments after `level` are not evaluated. `format` is a printf(3) format with
// its own "\n".
#define TW_LOG(categ, level, ...) TW_LOG_AS(__func__, categ, level, __VA_ARGS__)

// TW_LOG under the name of another function, `func`: for a helper that logs for the operation it is
// a step of, so that readers of the log find the name that they call.
#define TW_LOG_AS(func, categ, level, ...)                                                 \
  do {                                                                                     \
    const LOG_CATEG twLogCateg = (categ);                                                  \
    const LOG_LEVEL twLogLevel = (level);                                                  \
    if (TWLogEnabled(twLogCateg, twLogLevel)) {                                            \
      TWPrintf(LOG_TYPE_MAIN, TWLogName(twLogCateg), TWLogName(twLogLevel), TW_LOG_SOURCE, \
               __LINE__, (func), __VA_ARGS__);                                             \
    }                                                                                      \
  } while (0)

#endif  // TARNWICK_LOG_TWDEBUGLOG_H_
