# Cross build for 64-bit Windows with Debian's MinGW-w64 toolchain:
# tova.dll, qty.dll, tova.exe and the plug-ins, tested under Wine.
#   cmake -S . -B build/win64 -DCMAKE_TOOLCHAIN_FILE=cmake/toolchain-mingw-x86_64.cmake
set(CMAKE_SYSTEM_PROCESSOR x86_64)
include(${CMAKE_CURRENT_LIST_DIR}/toolchain-mingw-common.cmake)
