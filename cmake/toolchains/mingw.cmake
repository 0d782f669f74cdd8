# Windows with Debian's mingw-w64 (posix threads, for the tests' std::thread),
# for the target XTOK_MINGW_TARGET (e.g. i686-w64-mingw32) set by the includer.
set(CMAKE_SYSTEM_NAME Windows)
set(CMAKE_C_COMPILER ${XTOK_MINGW_TARGET}-gcc-posix)
set(CMAKE_CXX_COMPILER ${XTOK_MINGW_TARGET}-g++-posix)
set(CMAKE_RC_COMPILER ${XTOK_MINGW_TARGET}-windres)
set(CMAKE_FIND_ROOT_PATH /usr/${XTOK_MINGW_TARGET})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
set(CMAKE_CROSSCOMPILING_EMULATOR wine)
# Test programs carry their run-time libraries, as the DLL does.
set(CMAKE_EXE_LINKER_FLAGS_INIT -static)
