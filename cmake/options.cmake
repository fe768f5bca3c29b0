# Compiler options: target tarnwick_options for the library, the examples and the tests; target
# tarnwick_library_options for the library alone.
add_library(tarnwick_options INTERFACE)
add_library(tarnwick_library_options INTERFACE)
target_compile_options(tarnwick_options INTERFACE
  -Wall -Wextra -Wshadow -Wconversion -Wformat=2 -fstack-protector-strong)
# Tables of functions that are read-only once a program runs, and a stack that holds no code;
# scripts/check-hardening looks whether it came to that. Programs that are to lie at random
# addresses ask for POSITION_INDEPENDENT_CODE, for which CMake wants to know whether the linker can.
target_link_options(tarnwick_options INTERFACE
  LINKER:-z,relro LINKER:-z,now LINKER:-z,noexecstack)
include(CheckPIESupported)
check_pie_supported(LANGUAGES CXX)
# 64-bit file offsets on 32-bit targets: a log file grows past 2 GiB.
target_compile_definitions(tarnwick_options INTERFACE _GNU_SOURCE _FILE_OFFSET_BITS=64)
if(CMAKE_BUILD_TYPE STREQUAL "Debug")
  target_compile_definitions(tarnwick_options INTERFACE _GLIBCXX_ASSERTIONS)
elseif(NOT TARNWICK_SANITIZE)
  # The C library's checks of buffer sizes, unless the flags or the compiler's default have decided:
  # a distribution's choice may be a stronger one. A default shows only when it optimises.
  string(TOUPPER "${CMAKE_BUILD_TYPE}" build_type)
  set(flags "${CMAKE_CXX_FLAGS} ${CMAKE_CXX_FLAGS_${build_type}}")
  include(CheckCXXSourceCompiles)
  set(CMAKE_REQUIRED_FLAGS "${CMAKE_CXX_FLAGS_${build_type}} -O2")
  unset(fortify_is_open CACHE)  # the flags may have changed
  check_cxx_source_compiles("
    #ifdef _FORTIFY_SOURCE
    #error decided
    #endif
    int main() {}" fortify_is_open)
  unset(CMAKE_REQUIRED_FLAGS)
  if(fortify_is_open AND NOT flags MATCHES "_FORTIFY_SOURCE")
    target_compile_options(tarnwick_options INTERFACE -D_FORTIFY_SOURCE=2)
  endif()
endif()
if(TARNWICK_SANITIZE)
  # Undefined behaviour is looked for in the library: in GoogleTest's macros it would double the
  # time of the build.
  set(everywhere ${TARNWICK_SANITIZE})
  list(REMOVE_ITEM everywhere undefined)
  string(REPLACE ";" "," everywhere "${everywhere}")
  string(REPLACE ";" "," sanitizers "${TARNWICK_SANITIZE}")
  target_compile_options(tarnwick_options INTERFACE
    -fsanitize=${everywhere} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_compile_options(tarnwick_library_options INTERFACE -fsanitize=${sanitizers})
  target_link_options(tarnwick_options INTERFACE -fsanitize=${sanitizers})
endif()
if(TARNWICK_FUZZ)
  target_compile_options(tarnwick_library_options INTERFACE -fsanitize=fuzzer-no-link)
endif()
if(TARNWICK_COVERAGE)
  # Counters that threads do not tear, and names that do not depend on the working folder.
  target_compile_options(tarnwick_library_options INTERFACE
    --coverage -fprofile-update=atomic -fprofile-abs-path)
  target_link_options(tarnwick_options INTERFACE --coverage)
endif()
