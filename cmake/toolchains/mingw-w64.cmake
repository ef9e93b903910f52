# Shared part of the mingw-w64 toolchain files; they set TIKTAL_MINGW_TRIPLE and
# CMAKE_SYSTEM_PROCESSOR first.
#
# The -posix compilers: std::thread and std::mutex need the posix thread model. The C and C++
# run times (libgcc, libstdc++, winpthread) are linked statically, so the DLLs and programs need no
# mingw DLL beside them; winpthread as a whole archive, since libstdc++ comes after the program's
# own libraries on the link line and would otherwise bind to libwinpthread-1.dll.
#
# The cross-built dependencies (scripts/windows/deps.sh) are found in TIKTAL_WINDOWS_DEPS: CMake
# packages and headers there, pkg-config files in its lib/pkgconfig only.
set(CMAKE_SYSTEM_NAME Windows)
set(CMAKE_C_COMPILER ${TIKTAL_MINGW_TRIPLE}-gcc-posix)
set(CMAKE_CXX_COMPILER ${TIKTAL_MINGW_TRIPLE}-g++-posix)
set(CMAKE_RC_COMPILER ${TIKTAL_MINGW_TRIPLE}-windres)
set(CMAKE_DLLTOOL ${TIKTAL_MINGW_TRIPLE}-dlltool)

set(CMAKE_FIND_ROOT_PATH /usr/${TIKTAL_MINGW_TRIPLE} ${TIKTAL_WINDOWS_DEPS})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
set(CMAKE_TRY_COMPILE_PLATFORM_VARIABLES TIKTAL_WINDOWS_DEPS)
if(TIKTAL_WINDOWS_DEPS)
  set(ENV{PKG_CONFIG_LIBDIR} ${TIKTAL_WINDOWS_DEPS}/lib/pkgconfig)
  set(ENV{PKG_CONFIG_PATH} "")
endif()

set(TIKTAL_MINGW_STATIC_RUNTIME
  "-static-libgcc -static-libstdc++ -Wl,-Bstatic,--whole-archive -lwinpthread -Wl,--no-whole-archive,-Bdynamic")
set(CMAKE_EXE_LINKER_FLAGS_INIT "${TIKTAL_MINGW_STATIC_RUNTIME}")
set(CMAKE_SHARED_LINKER_FLAGS_INIT "${TIKTAL_MINGW_STATIC_RUNTIME}")
set(CMAKE_MODULE_LINKER_FLAGS_INIT "${TIKTAL_MINGW_STATIC_RUNTIME}")
