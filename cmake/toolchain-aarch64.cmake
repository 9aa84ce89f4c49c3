# Cross build for the device: AArch64 Linux, glibc, with Debian's
# aarch64-linux-gnu toolchain (scripts/deps.sh cross).
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR aarch64)

set(STBPLAT_CROSS_TRIPLE aarch64-linux-gnu)
set(STBPLAT_CROSS_SYSROOT /usr/${STBPLAT_CROSS_TRIPLE})

set(CMAKE_C_COMPILER ${STBPLAT_CROSS_TRIPLE}-gcc)
set(CMAKE_CXX_COMPILER ${STBPLAT_CROSS_TRIPLE}-g++)
# Named explicitly so that the export check and strip read AArch64 objects.
find_program(CMAKE_NM NAMES ${STBPLAT_CROSS_TRIPLE}-nm REQUIRED)
find_program(CMAKE_STRIP NAMES ${STBPLAT_CROSS_TRIPLE}-strip REQUIRED)

# Libraries and headers come from the target's tree only; programs run on the
# build machine.
set(CMAKE_FIND_ROOT_PATH ${STBPLAT_CROSS_SYSROOT})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

# Test programs run under user-mode emulation, with the target's dynamic
# loader and libraries. A preset or the command line may override this.
if(NOT CMAKE_CROSSCOMPILING_EMULATOR)
  set(CMAKE_CROSSCOMPILING_EMULATOR qemu-aarch64 -L ${STBPLAT_CROSS_SYSROOT})
endif()
