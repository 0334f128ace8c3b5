# Cross-build for the device's kind of CPU: 32-bit ARM (armhf), Debian's cross compiler and the
# armhf Android platform libraries. Native unit tests run under qemu-arm; there is no JVM.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR arm)
set(CMAKE_C_COMPILER arm-linux-gnueabihf-gcc)
set(CMAKE_CXX_COMPILER arm-linux-gnueabihf-g++)
set(CMAKE_LIBRARY_ARCHITECTURE arm-linux-gnueabihf)
set(CMAKE_FIND_ROOT_PATH /usr/arm-linux-gnueabihf /usr/lib/arm-linux-gnueabihf)
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY BOTH)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE BOTH)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE BOTH)
set(CMAKE_CROSSCOMPILING_EMULATOR qemu-arm -L /usr/arm-linux-gnueabihf)
set(DVB_JVM OFF CACHE BOOL "no JVM for armhf here")
set(DVB_RECEIVER OFF CACHE BOOL "the armhf build keeps to the library and the spy")
# GCC notes every ABI change of argument passing since GCC 7.1; nothing here crosses it.
set(CMAKE_CXX_FLAGS_INIT "-Wno-psabi")
