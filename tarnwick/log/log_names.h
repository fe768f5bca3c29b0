// How Enum2String finds a name.
#ifndef TARNWICK_LOG_LOG_NAMES_H_
#define TARNWICK_LOG_LOG_NAMES_H_

#include <map>

#include "tarnwick/log/twdebuglog.h"

namespace tarnwick {

// The one map of the process for LOG_CATEG or LOG_LEVEL, built by the first call and never changed.
template <typename T>
const TWEnum2StrMap<T>& NameMap();

// The name of `value`, or "unknown".
template <typename T>
const char* FindName(const std::map<T, const char*>& names, T value);

}  // namespace tarnwick

#endif  // TARNWICK_LOG_LOG_NAMES_H_
