// Settings of the library's calls for a part of one thread's work.
//
//   { TWRequestScope scope; scope.SetEscapedLog(true); SendHttpGet(host, 80, "/info.json",
//     response, 5, false);  // what the device sends cannot forge
//   }                                                        // a line of the log
//
// Without a scope every call does what it always did.
#ifndef TARNWICK_NET_TWREQUESTSCOPE_H_
#define TARNWICK_NET_TWREQUESTSCOPE_H_

#include "tarnwick/platform/export.h"

namespace tarnwick {
struct RequestSettings;
}

// From its construction to its destruction, the settings of all calls that the constructing thread
// makes, of any object.
//
// Scopes nest: a new one begins with the settings of the one around it, its setters change them for
// its own lifetime, and afterwards those of the outer one hold again. A scope is neither copied nor
// moved. Since version 1.1.0.
// Threads: belongs to the thread that made it, which alone may call and destroy it. Other threads
//   are not affected, those started inside it neither.
class TARNWICK_API TWRequestScope {
 public:
  // Throws nothing. Without memory the scope is empty: those of the outer one, if any, stay in
  // force, and the setters do nothing.
  TWRequestScope() noexcept;
  ~TWRequestScope();
  TWRequestScope(const TWRequestScope&) = delete;
  TWRequestScope& operator=(const TWRequestScope&) = delete;

  // False when there was no memory for it.
  bool Valid() const;

  // With true, text that came from a peer is escaped in the library's log lines: the body in the
  // messages that begin with "Failed to parse json", with the parser's own words about it, the body
  // in "strRet = " at debug2, and the header lines at debug3. Each line then ends where it seems to
  // end, and a terminal that shows it gets no commands.
  //
  // \xHH (upper case) represents each byte of a control character (U+0000 to U+001F, U+007F to
  // U+009F), of the separators U+2028 and U+2029, of a character that turns the direction of text
  // (U+061C, U+200E, U+200F, U+202A to U+202E, U+2066 to U+2069), and for each byte that is not
  // valid UTF-8; \\ represents a backslash. Other bytes stay, and what the calls return is never
  // escaped. Where there is no memory for the escaped text the line has "(no memory)" for it.
  void SetEscapedLog(bool on);

 private:
  tarnwick::RequestSettings* m_settings;
};

#endif  // TARNWICK_NET_TWREQUESTSCOPE_H_
