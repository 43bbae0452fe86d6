# Cross-build for the handset with Debian's g++-aarch64-linux-gnu.
# VANTLE_SYSROOT may name a folder with the arm64 libraries (libprotobuf-lite.a) unpacked in it.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR aarch64)
set(CMAKE_CXX_COMPILER aarch64-linux-gnu-g++)
set(CMAKE_LIBRARY_ARCHITECTURE aarch64-linux-gnu)
if(DEFINED ENV{VANTLE_SYSROOT})
  list(APPEND CMAKE_FIND_ROOT_PATH $ENV{VANTLE_SYSROOT})
endif()
list(APPEND CMAKE_FIND_ROOT_PATH /usr/aarch64-linux-gnu)
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY BOTH)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE BOTH)
