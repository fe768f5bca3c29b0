# What the toolchain files for other architectures share. They set TARNWICK_TRIPLET, Debian's name
# for the folders of the architecture; scripts/sysroot lays out the folder TARNWICK_SYSROOT.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_LIBRARY_ARCHITECTURE ${TARNWICK_TRIPLET})
set(CMAKE_TRY_COMPILE_PLATFORM_VARIABLES TARNWICK_SYSROOT)

set(CMAKE_SYSROOT ${TARNWICK_SYSROOT})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

# CMake's find modules ask pkg-config, which would tell about the machine's own libraries.
set(ENV{PKG_CONFIG_SYSROOT_DIR} ${CMAKE_SYSROOT})
set(ENV{PKG_CONFIG_LIBDIR}
  ${CMAKE_SYSROOT}/usr/lib/${TARNWICK_TRIPLET}/pkgconfig:${CMAKE_SYSROOT}/usr/share/pkgconfig)
