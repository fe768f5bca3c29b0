# Toolchain file: 32-bit x86. The machine's own processor runs what is built, with the sysroot's
# loader and libraries: a fast look at a word size of 32 bits.
set(CMAKE_SYSTEM_PROCESSOR i686)
set(CMAKE_CXX_COMPILER i686-linux-gnu-g++)
set(TARNWICK_TRIPLET i386-linux-gnu)
include(${CMAKE_CURRENT_LIST_DIR}/sysroot.cmake)

# An old-style path holds for the libraries' own libraries too.
string(CONCAT CMAKE_EXE_LINKER_FLAGS_INIT
  "-Wl,--dynamic-linker=${CMAKE_SYSROOT}/lib/ld-linux.so.2 -Wl,--disable-new-dtags "
  "-Wl,-rpath,${CMAKE_SYSROOT}/lib/i386-linux-gnu:${CMAKE_SYSROOT}/usr/lib/i386-linux-gnu")
