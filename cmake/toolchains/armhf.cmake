# 32-bit ARM (hard float) with Debian's cross compiler; target programs run
# under qemu-user against the cross toolchain's libraries.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR arm)

set(METAINFO_TARGET_TRIPLE arm-linux-gnueabihf)
set(METAINFO_TARGET_SYSROOT /usr/${METAINFO_TARGET_TRIPLE})

set(CMAKE_C_COMPILER ${METAINFO_TARGET_TRIPLE}-gcc)
set(CMAKE_CXX_COMPILER ${METAINFO_TARGET_TRIPLE}-g++)

# Headers, libraries and packages come from the target's tree only; build
# tools (nm, the host's cmake) from the host.
set(CMAKE_FIND_ROOT_PATH ${METAINFO_TARGET_SYSROOT})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

# ctest and gtest_discover_tests start target programs through qemu.
find_program(METAINFO_QEMU_ARM qemu-arm)
if(METAINFO_QEMU_ARM)
  set(CMAKE_CROSSCOMPILING_EMULATOR ${METAINFO_QEMU_ARM} -L ${METAINFO_TARGET_SYSROOT})
endif()
