# The part of the MinGW-w64 toolchain files (toolchain-mingw-x86_64.cmake,
# toolchain-mingw-i686.cmake) that both share: Debian's cross compilers with
# posix threads, the target's own libraries and headers only, and Wine to run
# the programs of the build (test discovery, ctest). The including file sets
# CMAKE_SYSTEM_PROCESSOR first.
set(CMAKE_SYSTEM_NAME Windows)
set(TOVA_MINGW_TRIPLET ${CMAKE_SYSTEM_PROCESSOR}-w64-mingw32)

set(CMAKE_C_COMPILER ${TOVA_MINGW_TRIPLET}-gcc-posix)
set(CMAKE_CXX_COMPILER ${TOVA_MINGW_TRIPLET}-g++-posix)
set(CMAKE_RC_COMPILER ${TOVA_MINGW_TRIPLET}-windres)

set(CMAKE_FIND_ROOT_PATH /usr/${TOVA_MINGW_TRIPLET})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

find_program(TOVA_WINE NAMES wine wine-stable)
if(TOVA_WINE)
  set(CMAKE_CROSSCOMPILING_EMULATOR ${TOVA_WINE})
endif()
