// The wrappers of libcurl's variadic calls, which also record what they are given.
#include <cstdarg>
#include <string>

#include "tests/support/faults.h"

#undef curl_easy_setopt
#undef curl_easy_getinfo

namespace {

bool IsOffset(CURLoption option) {
  return option >= CURLOPTTYPE_OFF_T && option < CURLOPTTYPE_BLOB;
}

bool IsNumber(CURLoption option) {
  return option < CURLOPTTYPE_OBJECTPOINT;
}

CurlOption DescribePointer(CURLoption option, const void* pointer) {
  CurlOption given = {option, 0, "", {}, pointer};
  const curl_easyoption* kind = curl_easy_option_by_id(option);
  const bool is_text =
      option == CURLOPT_POSTFIELDS || (kind != nullptr && kind->type == CURLOT_STRING);
  if (is_text && pointer != nullptr) given.text = static_cast<const char*>(pointer);
  if (kind != nullptr && kind->type == CURLOT_SLIST) {
    for (auto* item = static_cast<const curl_slist*>(pointer); item != nullptr; item = item->next) {
      given.list.emplace_back(item->data);
    }
  }
  return given;
}

CURLcode Refusal(const std::optional<Faults::Verdict>& verdict) {
  return static_cast<CURLcode>(verdict->result);
}

std::optional<Faults::Verdict> Ask(CurlOption option) {
  Faults* faults = Faults::Current();
  return faults != nullptr ? faults->NextCurlOption(std::move(option)) : std::nullopt;
}

}  // namespace

extern "C" CURLcode __real_curl_easy_setopt(CURL* easy, CURLoption option, ...);
extern "C" CURLcode __wrap_curl_easy_setopt(CURL* easy, CURLoption option, ...) {
  va_list args;
  va_start(args, option);
  long number = 0;
  curl_off_t offset = 0;
  void* pointer = nullptr;
  if (IsNumber(option)) {
    number = va_arg(args, long);
  } else if (IsOffset(option)) {
    offset = va_arg(args, curl_off_t);
  } else {
    pointer = va_arg(args, void*);
  }
  va_end(args);

  if (IsNumber(option)) {
    const auto verdict = Ask({option, number, "", {}, nullptr});
    return verdict ? Refusal(verdict) : __real_curl_easy_setopt(easy, option, number);
  }
  if (IsOffset(option)) {
    const auto verdict = Ask({option, static_cast<long>(offset), "", {}, nullptr});
    return verdict ? Refusal(verdict) : __real_curl_easy_setopt(easy, option, offset);
  }
  const auto verdict = Ask(DescribePointer(option, pointer));
  return verdict ? Refusal(verdict) : __real_curl_easy_setopt(easy, option, pointer);
}

extern "C" CURLcode __real_curl_easy_getinfo(CURL* easy, CURLINFO info, ...);
extern "C" CURLcode __wrap_curl_easy_getinfo(CURL* easy, CURLINFO info, ...) {
  Faults* faults = Faults::Current();
  if (faults != nullptr) {
    const auto verdict = faults->Next(Call::kCurlEasyGetinfo);
    if (verdict) return Refusal(verdict);
  }
  va_list args;
  va_start(args, info);
  void* place = va_arg(args, void*);
  va_end(args);
  return __real_curl_easy_getinfo(easy, info, place);
}

extern "C" void __real_curl_easy_cleanup(CURL* easy);
extern "C" void __wrap_curl_easy_cleanup(CURL* easy) {
  if (Faults* faults = Faults::Current()) faults->Next(Call::kCurlEasyCleanup);
  __real_curl_easy_cleanup(easy);
}

extern "C" void __real_curl_slist_free_all(curl_slist* list);
extern "C" void __wrap_curl_slist_free_all(curl_slist* list) {
  if (Faults* faults = Faults::Current()) faults->Next(Call::kCurlSlistFreeAll);
  __real_curl_slist_free_all(list);
}
