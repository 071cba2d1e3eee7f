# The 32-bit ARM target.
set(CMAKE_SYSTEM_PROCESSOR armv7l)
set(VESK_ARM_SYSROOT ${CMAKE_CURRENT_LIST_DIR}/../build-armhf-sysroot CACHE PATH "armhf sysroot")
list(APPEND CMAKE_TRY_COMPILE_PLATFORM_VARIABLES VESK_ARM_SYSROOT)
set(VESK_SYSROOT ${VESK_ARM_SYSROOT})
set(VESK_TRIPLET arm-linux-gnueabihf)
set(VESK_MULTIARCH arm-linux-gnueabihf)
include(${CMAKE_CURRENT_LIST_DIR}/cross.cmake)
# Not a word about what GCC 7 changed: everything here is built by one compiler.
set(CMAKE_CXX_FLAGS_INIT -Wno-psabi)
set(CMAKE_CROSSCOMPILING_EMULATOR qemu-arm-static -L ${VESK_ARM_SYSROOT})
