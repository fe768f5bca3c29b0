#include "tarnwick/net/twrequestscope.h"

#include <exception>
#include <new>

#include "tarnwick/net/request_settings.h"
#include "tarnwick/utils/escape_text.h"

namespace tarnwick {

namespace {

thread_local RequestSettings* t_settings = nullptr;

}  // namespace

const RequestSettings* CurrentRequestSettings() {
  return t_settings;
}

void PeerText::Escape() try {
  m_escaped = EscapeText(m_text);
  m_text = m_escaped.c_str();
} catch (const std::exception&) {
  m_text = "(no memory)";
}

}  // namespace tarnwick

using tarnwick::RequestSettings;
using tarnwick::t_settings;

TWRequestScope::TWRequestScope() noexcept : m_settings(new (std::nothrow) RequestSettings()) {
  if (m_settings == nullptr) return;
  if (t_settings != nullptr) *m_settings = *t_settings;
  m_settings->outer = t_settings;
  t_settings = m_settings;
}

// Wherever it is in the thread's list: scopes on the heap may go in any order.
TWRequestScope::~TWRequestScope() {
  for (RequestSettings** at = &t_settings; *at != nullptr; at = &(*at)->outer) {
    if (*at != m_settings) continue;
    *at = m_settings->outer;
    break;
  }
  delete m_settings;
}

bool TWRequestScope::Valid() const {
  return m_settings != nullptr;
}

void TWRequestScope::SetEscapedLog(bool on) {
  if (m_settings != nullptr) m_settings->escapedLog = on;
}
