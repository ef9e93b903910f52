# 64-bit Windows with mingw-w64: cmake -DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/x86_64-w64-mingw32.cmake
#   -DTIKTAL_WINDOWS_DEPS=<prefix of scripts/windows/deps.sh x86_64>
set(CMAKE_SYSTEM_PROCESSOR AMD64)
set(TIKTAL_MINGW_TRIPLE x86_64-w64-mingw32)
include(${CMAKE_CURRENT_LIST_DIR}/mingw-w64.cmake)
