# Cross-compiling for Windows x86-64 with Debian's MinGW-w64 (posix threads).
#   cmake -S . -B build-win -DCMAKE_TOOLCHAIN_FILE=cmake/mingw-w64-x86_64.cmake
set(CMAKE_SYSTEM_NAME Windows)
set(CMAKE_SYSTEM_PROCESSOR x86_64)

set(VX_MINGW_PREFIX x86_64-w64-mingw32)
set(CMAKE_C_COMPILER ${VX_MINGW_PREFIX}-gcc-posix)
set(CMAKE_CXX_COMPILER ${VX_MINGW_PREFIX}-g++-posix)
set(CMAKE_RC_COMPILER ${VX_MINGW_PREFIX}-windres)

# Look for libraries and headers only in the MinGW tree and in the prefixes
# named by CMAKE_PREFIX_PATH / CMAKE_FIND_ROOT_PATH (the cross-built deps);
# programs still come from the build machine.
list(APPEND CMAKE_FIND_ROOT_PATH /usr/${VX_MINGW_PREFIX})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

# Nothing but Windows system DLLs at run time: the GCC runtime, the C++
# library and winpthreads are linked in.
set(CMAKE_EXE_LINKER_FLAGS_INIT "-static -static-libgcc -static-libstdc++")
set(CMAKE_SHARED_LINKER_FLAGS_INIT "-static -static-libgcc -static-libstdc++")
# C99 formatting (as on Linux) instead of the MSVC runtime's, and
# <windows.h> without its min and max macros, which break std::min.
set(VX_WINDOWS_DEFINES "-D__USE_MINGW_ANSI_STDIO=1 -DNOMINMAX -DWIN32_LEAN_AND_MEAN")
set(CMAKE_C_FLAGS_INIT "${VX_WINDOWS_DEFINES}")
set(CMAKE_CXX_FLAGS_INIT "${VX_WINDOWS_DEFINES}")
# -O2 as on Linux: GCC 12 at -O3 reports false buffer overflows in loops
# bounded by counts checked just before.
# (CMake appends its -O3 to the _INIT values, so the cache entries are set.)
set(CMAKE_C_FLAGS_RELEASE "-O2 -DNDEBUG" CACHE STRING "")
set(CMAKE_CXX_FLAGS_RELEASE "-O2 -DNDEBUG" CACHE STRING "")
