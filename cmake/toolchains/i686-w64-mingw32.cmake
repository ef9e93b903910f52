# 32-bit Windows with mingw-w64: cmake -DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/i686-w64-mingw32.cmake
#   -DTIKTAL_WINDOWS_DEPS=<prefix of scripts/windows/deps.sh i686>
set(CMAKE_SYSTEM_PROCESSOR x86)
set(TIKTAL_MINGW_TRIPLE i686-w64-mingw32)
include(${CMAKE_CURRENT_LIST_DIR}/mingw-w64.cmake)
