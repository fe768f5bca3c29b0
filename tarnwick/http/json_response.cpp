#include "tarnwick/http/json_response.h"

#include <json/reader.h>
#include <pthread.h>

#include <algorithm>
#include <cstdint>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/request_settings.h"
#include "tarnwick/platform/cancel.h"

namespace tarnwick {

namespace {

// A response of so few levels is parsed without a look at the stack.
constexpr int kShallowDepth = 16;

// What the parser uses for a level of nesting, measured at 512 bytes on amd64, and what it needs
// besides.
constexpr size_t kStackPerLevel = 640;
constexpr size_t kStackReserve = 16384;

// What is assumed where the system does not tell, without /proc for example, and on a stack that is
// not the thread's own, as makecontext gives.
constexpr size_t kUnknownStack = 65536;

// Bytes between here and the end of the thread's stack.
size_t StackLeft() {
  const NoCancel no_cancel;
  pthread_attr_t attributes;
  if (pthread_getattr_np(pthread_self(), &attributes) != 0) return kUnknownStack;
  void* lowest = nullptr;
  size_t size = 0;
  pthread_attr_getstack(&attributes, &lowest, &size);
  pthread_attr_destroy(&attributes);
  const auto here = reinterpret_cast<uintptr_t>(__builtin_frame_address(0));
  const auto end = reinterpret_cast<uintptr_t>(lowest);
  return here >= end && here - end < size ? here - end : kUnknownStack;
}

// How often `c` occurs in `text`, counted up to `limit`.
int CountUpTo(int limit, const std::string& text, char c) {
  int count = 0;
  for (size_t at = text.find(c); at != std::string::npos && count < limit;
       at = text.find(c, at + 1)) {
    ++count;
  }
  return count;
}

bool FitsStack(const std::string& text) {
  // Most responses have fewer brackets than that, inside strings or not, and counting them is
  // quicker.
  const int objects = CountUpTo(kShallowDepth + 1, text, '{');
  if (objects + CountUpTo(kShallowDepth + 1, text, '[') <= kShallowDepth) return true;
  const int depth = JsonDepth(text);
  if (depth <= kShallowDepth) return true;
  return StackLeft() / kStackPerLevel >=
         static_cast<size_t>(depth) + kStackReserve / kStackPerLevel;
}

// The position after the string, or the comment, that begins at `begin`.
size_t SkipString(const std::string& text, size_t begin) {
  size_t i = begin + 1;
  while (i < text.size() && text[i] != '"') i += text[i] == '\\' ? 2 : 1;
  return i + 1;
}

size_t SkipComment(const std::string& text, size_t begin) {
  const bool block = text.compare(begin, 2, "/*") == 0;
  if (!block && text.compare(begin, 2, "//") != 0) return begin + 1;
  const size_t end = block ? text.find("*/", begin + 2) : text.find_first_of("\r\n", begin);
  if (end == std::string::npos) return text.size();
  return end + (block ? 2 : 1);
}

// The deprecated reader takes comments and any root; pinned by
// JsonParse.CommentsAreTakenAndCollected and JsonParse.ARootOfAnotherKindHasNoSuccess.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

// Results: true when parsed; otherwise `error` tells why not. The parser throws where it gives up,
// and services' callers must not see that.
bool Parse(const std::string& text, Json::Value* value, std::string* error) {
  if (!FitsStack(text)) {
    *error = "nested too deeply";
    return false;
  }
  try {
    Json::Reader reader;
    if (reader.parse(text, *value, true)) return true;
    *error = reader.getFormattedErrorMessages();
  } catch (const Json::Exception& exception) {
    *error = exception.what();
  }
  return false;
}

#pragma GCC diagnostic pop

// asBool throws for texts, arrays and objects, and isMember for a root that is no object.
bool IsSuccess(const Json::Value& value) {
  if (!value.isObject() || !value.isMember("success")) return false;
  const Json::Value& success = value["success"];
  return (success.isBool() || success.isNumeric()) && success.asBool();
}

}  // namespace

int JsonDepth(const std::string& text) {
  int depth = 0;
  int deepest = 0;
  for (size_t i = 0; i < text.size();) {
    const char c = text[i];
    if (c == '"') {
      i = SkipString(text, i);
    } else if (c == '/') {
      i = SkipComment(text, i);
    } else {
      if (c == '[' || c == '{') deepest = std::max(deepest, ++depth);
      if (c == ']' || c == '}') --depth;
      ++i;
    }
  }
  return deepest;
}

int JsonParse(const std::string& text, Json::Value& value) {
  // Pinned by SendHttpsGet.AnEmptyBodyIsSuccessAndLeavesTheResult.
  if (text.empty()) return 0;
  std::string error;
  if (!Parse(text, &value, &error)) {
    // Without the level gate and without tags; pinned by JsonParse.ItsLineHasNoGate.
    TWPrintf(LOG_TYPE_MAIN, nullptr, nullptr, "twhttp", __LINE__, __func__,
             "Failed to parse json: [%s] with error [%s]\n", tarnwick::PeerText(text.c_str()).Get(),
             tarnwick::PeerText(error.c_str()).Get());
    return -1;
  }
  return IsSuccess(value) ? 0 : -2;
}

}  // namespace tarnwick
