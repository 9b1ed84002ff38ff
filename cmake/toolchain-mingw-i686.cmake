# Cross build for 32-bit Windows with Debian's MinGW-w64 toolchain:
# tova.dll, qty.dll, tova.exe and the plug-ins, tested under Wine.
#   cmake -S . -B build/win32 -DCMAKE_TOOLCHAIN_FILE=cmake/toolchain-mingw-i686.cmake
set(CMAKE_SYSTEM_PROCESSOR i686)
include(${CMAKE_CURRENT_LIST_DIR}/toolchain-mingw-common.cmake)
