# Compiler options that the library, the examples and the tests share: target tarnwick_options.
add_library(tarnwick_options INTERFACE)
target_compile_options(tarnwick_options INTERFACE
  -Wall -Wextra -Wshadow -Wconversion -Wformat=2 -fstack-protector-strong)
# 64-bit file offsets on 32-bit targets: a log file grows past 2 GiB.
target_compile_definitions(tarnwick_options INTERFACE _GNU_SOURCE _FILE_OFFSET_BITS=64)
if(CMAKE_BUILD_TYPE STREQUAL "Debug")
  target_compile_definitions(tarnwick_options INTERFACE _GLIBCXX_ASSERTIONS)
elseif(NOT TARNWICK_SANITIZE)
  target_compile_options(tarnwick_options INTERFACE -U_FORTIFY_SOURCE)
  target_compile_definitions(tarnwick_options INTERFACE _FORTIFY_SOURCE=2)
endif()
if(TARNWICK_SANITIZE)
  target_compile_options(tarnwick_options INTERFACE
    -fsanitize=${TARNWICK_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(tarnwick_options INTERFACE -fsanitize=${TARNWICK_SANITIZE})
endif()
if(TARNWICK_COVERAGE)
  # Counters that threads do not tear, and names that do not depend on the working folder.
  target_compile_options(tarnwick_options INTERFACE
    --coverage -O0 -fprofile-update=atomic -fprofile-abs-path)
  target_link_options(tarnwick_options INTERFACE --coverage)
endif()
