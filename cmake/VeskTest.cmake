# vesk_gtest(<program>): makes a GoogleTest program's tests known to CTest, one by one. In a cross build
# the program is one test: starting the emulator costs more than most tests.
include(GoogleTest)

# Most of the time of a build goes into the headers that every unit test includes. The plain builds (dev)
# read them anew in each file all the same: there a missing include shows.
option(VESK_PRECOMPILE "Compile the headers of the unit tests once" OFF)
if(VESK_PRECOMPILE)
  # A program, as those that use them: a library's objects are compiled in another way.
  file(WRITE ${CMAKE_CURRENT_BINARY_DIR}/precompiled.cpp "int main() {}\n")
  add_executable(vesk_test_headers ${CMAKE_CURRENT_BINARY_DIR}/precompiled.cpp)
  target_link_libraries(vesk_test_headers PRIVATE vesk::options GTest::gtest)
  target_precompile_headers(vesk_test_headers PRIVATE
    <gtest/gtest.h> <algorithm> <filesystem> <fstream> <functional> <string> <thread> <vector>)
endif()

function(vesk_gtest program)
  if(VESK_PRECOMPILE)
    target_precompile_headers(${program} REUSE_FROM vesk_test_headers)
  endif()
  if(CMAKE_CROSSCOMPILING)
    add_test(NAME ${program} COMMAND ${program})
    set_tests_properties(${program} PROPERTIES LABELS unit TIMEOUT 300)
  else()
    gtest_discover_tests(${program} PROPERTIES LABELS unit TIMEOUT 60)
  endif()
endfunction()
