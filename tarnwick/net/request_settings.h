// What a TWRequestScope holds, for the library's own calls.
#ifndef TARNWICK_NET_REQUEST_SETTINGS_H_
#define TARNWICK_NET_REQUEST_SETTINGS_H_

#include <string>

namespace tarnwick {

struct RequestSettings {
  RequestSettings* outer = nullptr;  // of the scope around it
  bool escapedLog = false;
};

// Those of the thread's innermost scope; null without one.
const RequestSettings* CurrentRequestSettings();

// A text of a peer as a log line shows it: as it is up to its first zero byte, or escaped in a
// scope that says so.
//
//   TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG3, "%s\n", PeerText(line).Get());
class PeerText {
 public:
  // `text` must outlive the object. Without memory for the escaped text the line says so instead:
  // a log call throws nothing.
  explicit PeerText(const char* text) : m_text(text) {
    const RequestSettings* settings = CurrentRequestSettings();
    if (settings != nullptr && settings->escapedLog) Escape();
  }
  PeerText(const PeerText&) = delete;
  PeerText& operator=(const PeerText&) = delete;

  const char* Get() const { return m_text; }

 private:
  void Escape();

  const char* m_text;
  std::string m_escaped;
};

}  // namespace tarnwick

#endif  // TARNWICK_NET_REQUEST_SETTINGS_H_
