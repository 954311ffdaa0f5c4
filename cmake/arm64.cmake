# Compiles for 64-bit ARM on another machine, against the root that scripts/arm64-root makes, and runs
# what is compiled with an emulator:
#   cmake --toolchain cmake/arm64.cmake -DTEISEIGATRO_ARM64_ROOT=DIR
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR aarch64)

set(TEISEIGATRO_ARM64_ROOT "${CMAKE_CURRENT_LIST_DIR}/../build/arm64-root" CACHE PATH
    "With cmake/arm64.cmake: the root with the libraries of the machine that is compiled for")
list(APPEND CMAKE_TRY_COMPILE_PLATFORM_VARIABLES TEISEIGATRO_ARM64_ROOT)
file(REAL_PATH "${TEISEIGATRO_ARM64_ROOT}" CMAKE_SYSROOT)

# clang compiles for every machine and finds the C++ library in the root: beside it only a linker for
# that machine is needed.
set(CMAKE_CXX_COMPILER clang++-14)
set(CMAKE_CXX_COMPILER_TARGET aarch64-linux-gnu)
foreach(kind EXE SHARED MODULE)
  set(CMAKE_${kind}_LINKER_FLAGS_INIT -fuse-ld=lld-14)
endforeach()

# Programs run here; everything else is the other machine's.
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
set(ENV{PKG_CONFIG_SYSROOT_DIR} "${CMAKE_SYSROOT}")
set(ENV{PKG_CONFIG_LIBDIR}
    "${CMAKE_SYSROOT}/usr/lib/aarch64-linux-gnu/pkgconfig:${CMAKE_SYSROOT}/usr/share/pkgconfig")

# Debian's file for find_package(xapian) knows absolute paths only, and keeps these.
set(XAPIAN_SHARED_LIBRARY "${CMAKE_SYSROOT}/usr/lib/aarch64-linux-gnu/libxapian.so"
    CACHE FILEPATH "The search library in the root")
set(XAPIAN_INCLUDE_DIR "${CMAKE_SYSROOT}/usr/include" CACHE PATH "Its headers")

# The root's own loader finds the root's libraries. The emulator could look for every file there first
# (-L), but remembers what it found, which is wrong in a program that goes on in another root.
set(lib "${CMAKE_SYSROOT}/lib")
set(CMAKE_CROSSCOMPILING_EMULATOR
    qemu-aarch64-static "${lib}/ld-linux-aarch64.so.1"
    --library-path "${lib}/aarch64-linux-gnu:${CMAKE_SYSROOT}/usr/lib/aarch64-linux-gnu")
unset(lib)
