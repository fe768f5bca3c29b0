// The program's own allocation functions, which every library in the process calls in place of the
// C and the C++ library's. They pass on to the address sanitizer's where it is built in, so that
// blocks keep their red zones, and else to the C library's.
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>

#include "tests/torture/injection.h"

#ifdef TARNWICK_TORTURE_ASAN
#define REAL(name) __interceptor_##name
#else
#define REAL(name) __libc_##name
#endif

extern "C" {
void* REAL(malloc)(size_t size);
void* REAL(calloc)(size_t count, size_t size);
void* REAL(realloc)(void* block, size_t size);
void* REAL(memalign)(size_t alignment, size_t size);
void REAL(free)(void* block);
}

namespace {

bool Fails() {
  return t_injection.armed && NextAllocationFails();
}

void* OutOfMemory() {
  errno = ENOMEM;
  return nullptr;
}

void* Counted(void* block) {
  if (block != nullptr && t_injection.counting_blocks) ++t_injection.blocks;
  return block;
}

void Release(void* block) {
  if (block != nullptr && t_injection.counting_blocks) --t_injection.blocks;
  REAL(free)(block);
}

void* Aligned(size_t alignment, size_t size) {
  return Fails() ? OutOfMemory() : Counted(REAL(memalign)(alignment, size));
}

void* NewOrThrow(void* block) {
  if (block == nullptr) throw std::bad_alloc();
  return block;
}

char* CopyOf(const char* text, size_t length) {
  char* const copy = static_cast<char*>(malloc(length + 1));
  if (copy == nullptr) return nullptr;
  memcpy(copy, text, length);
  copy[length] = '\0';
  return copy;
}

}  // namespace

// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name): the C library's are reserved
extern "C" {

void* malloc(size_t size) noexcept {
  return Fails() ? OutOfMemory() : Counted(REAL(malloc)(size));
}

void* calloc(size_t count, size_t size) noexcept {
  return Fails() ? OutOfMemory() : Counted(REAL(calloc)(count, size));
}

void* realloc(void* block, size_t size) noexcept {
  if (block == nullptr) return malloc(size);
  if (size == 0) {
    Release(block);
    return nullptr;
  }
  return Fails() ? OutOfMemory() : REAL(realloc)(block, size);
}

void* reallocarray(void* block, size_t count, size_t size) noexcept {
  size_t bytes;
  if (__builtin_mul_overflow(count, size, &bytes)) return OutOfMemory();
  return realloc(block, bytes);
}

void free(void* block) noexcept {
  Release(block);
}

void* memalign(size_t alignment, size_t size) noexcept {
  return Aligned(alignment, size);
}

void* aligned_alloc(size_t alignment, size_t size) noexcept {
  return Aligned(alignment, size);
}

int posix_memalign(void** block, size_t alignment, size_t size) noexcept {
  void* const fresh = Aligned(alignment, size);
  if (fresh == nullptr) return ENOMEM;
  *block = fresh;
  return 0;
}

// The sanitizer's own copying functions would allocate unseen by this file.
char* strdup(const char* text) noexcept {
  return CopyOf(text, strlen(text));
}

char* __strdup(const char* text) noexcept {
  return CopyOf(text, strlen(text));
}

char* strndup(const char* text, size_t most) noexcept {
  return CopyOf(text, strnlen(text, most));
}

}  // extern "C"
// NOLINTEND(readability-inconsistent-declaration-parameter-name)

void* operator new(size_t size) {
  return NewOrThrow(malloc(size));
}
void* operator new[](size_t size) {
  return NewOrThrow(malloc(size));
}
void* operator new(size_t size, const std::nothrow_t&) noexcept {
  return malloc(size);
}
void* operator new[](size_t size, const std::nothrow_t&) noexcept {
  return malloc(size);
}
void* operator new(size_t size, std::align_val_t alignment) {
  return NewOrThrow(Aligned(static_cast<size_t>(alignment), size));
}
void operator delete(void* block) noexcept {
  Release(block);
}
void operator delete[](void* block) noexcept {
  Release(block);
}
void operator delete(void* block, size_t) noexcept {
  Release(block);
}
void operator delete[](void* block, size_t) noexcept {
  Release(block);
}
void operator delete(void* block, std::align_val_t) noexcept {
  Release(block);
}
void operator delete(void* block, size_t, std::align_val_t) noexcept {
  Release(block);
}
