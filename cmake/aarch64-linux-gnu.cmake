# Cross-build for the handset with Debian's g++-aarch64-linux-gnu. The arm64 libraries lie in the folder that
# VANTLE_SYSROOT names, or where scripts/setup-handset unpacks them.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR aarch64)
set(CMAKE_CXX_COMPILER aarch64-linux-gnu-g++)
set(CMAKE_LIBRARY_ARCHITECTURE aarch64-linux-gnu)
# Tests, and what the build itself runs, are run by the emulator.
set(CMAKE_CROSSCOMPILING_EMULATOR qemu-aarch64-static)

if(DEFINED ENV{VANTLE_SYSROOT})
  list(APPEND CMAKE_FIND_ROOT_PATH $ENV{VANTLE_SYSROOT})
else()
  get_filename_component(vantle_sysroot ${CMAKE_CURRENT_LIST_DIR}/../build/sysroot-aarch64 ABSOLUTE)
  list(APPEND CMAKE_FIND_ROOT_PATH ${vantle_sysroot})
endif()
list(APPEND CMAKE_FIND_ROOT_PATH /usr/aarch64-linux-gnu)
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE BOTH)
