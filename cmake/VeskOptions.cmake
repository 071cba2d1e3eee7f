# Build-wide settings: language level, warnings, sanitizers and where the products go.

set(VESK_APPLIANCE_PREFIX "" CACHE PATH
    "Folder whose lib/ holds the appliance's own libraries; empty: build the stand-ins")
option(VESK_WERROR "Treat warnings as errors" OFF)
set(VESK_SANITIZE "" CACHE STRING "Sanitizers to compile with, for instance address,undefined or thread")
option(VESK_BENCH "Build the measurements of bench/" OFF)
option(VESK_COVERAGE "Instrument for gcov" OFF)
option(VESK_HARDENING "Let a mistake end the program instead of letting others use it" ON)

if(NOT CMAKE_BUILD_TYPE AND NOT CMAKE_CONFIGURATION_TYPES)
  set(CMAKE_BUILD_TYPE RelWithDebInfo CACHE STRING "Build type" FORCE)
endif()

set(CMAKE_CXX_STANDARD 17)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(CMAKE_RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/bin)
set(CMAKE_LIBRARY_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/lib)
set(CMAKE_ARCHIVE_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/lib)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
# Libraries are found from the binary's own place, so that a build tree or an installed one can be moved.
# Where installing would rewrite the path, CMake pads the one of the build tree with an empty entry, and
# that stands for the folder in which the program is started; so both are the same. With the appliance's own
# libraries the build tree needs their folder, which must not be in what is installed.
set(CMAKE_BUILD_RPATH_USE_ORIGIN ON)
if(NOT VESK_APPLIANCE_PREFIX)
  set(CMAKE_BUILD_WITH_INSTALL_RPATH ON)
  set(CMAKE_INSTALL_RPATH $ORIGIN/../lib)
endif()

add_library(vesk_options INTERFACE)
add_library(vesk::options ALIAS vesk_options)
# GNU interfaces (O_DIRECT, process_vm_readv), 64-bit file offsets and times on every platform: with 32 bits
# no file dated outside 1901 to 2038 can be asked for anything.
target_compile_definitions(vesk_options INTERFACE _GNU_SOURCE _FILE_OFFSET_BITS=64 _TIME_BITS=64)
target_compile_options(vesk_options INTERFACE
  -Wall -Wextra -Wconversion -Wshadow -ffunction-sections -fdata-sections)
if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
  target_compile_options(vesk_options INTERFACE -Wthread-safety)
endif()
# A run path that LD_LIBRARY_PATH overrides: an appliance puts its own libraries in place that way.
target_link_options(vesk_options INTERFACE -Wl,--gc-sections -Wl,--enable-new-dtags -Wl,--as-needed)

# What makes a mistake end the program instead of letting others use it: guarded stacks, tables of addresses that
# nobody can write to, and C and C++ library functions that look at the sizes they are given. The sanitizers do the
# same better. Without optimising the C library has no sizes to look at, and says so in every file; what builds
# packages may have asked for the same already, at a level of its own.
if(VESK_HARDENING AND NOT VESK_SANITIZE)
  target_compile_options(vesk_options INTERFACE -fstack-protector-strong)
  target_compile_options(vesk_options INTERFACE
    $<$<NOT:$<CONFIG:Debug>>:-U_FORTIFY_SOURCE> $<$<NOT:$<CONFIG:Debug>>:-D_FORTIFY_SOURCE=2>)
  target_compile_definitions(vesk_options INTERFACE _GLIBCXX_ASSERTIONS)
  target_link_options(vesk_options INTERFACE -Wl,-z,relro -Wl,-z,now)
endif()

if(VESK_WERROR)
  target_compile_options(vesk_options INTERFACE -Werror)
endif()
if(VESK_SANITIZE)
  target_compile_options(vesk_options INTERFACE
    -fsanitize=${VESK_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(vesk_options INTERFACE -fsanitize=${VESK_SANITIZE})
endif()
if(VESK_COVERAGE)
  target_compile_options(vesk_options INTERFACE --coverage -fprofile-update=atomic)
  target_link_options(vesk_options INTERFACE --coverage)
endif()
