# Cross compilation against a sysroot of Debian's packages. The toolchain files set the processor, the
# sysroot and the target's triplet, and include this.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_CXX_COMPILER ${VESK_TRIPLET}-g++)
set(CMAKE_SYSROOT ${VESK_SYSROOT})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
set(ENV{PKG_CONFIG_LIBDIR} ${VESK_SYSROOT}/usr/lib/${VESK_MULTIARCH}/pkgconfig)
set(ENV{PKG_CONFIG_SYSROOT_DIR} ${VESK_SYSROOT})
