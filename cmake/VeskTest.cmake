# vesk_gtest(<program>): makes a GoogleTest program's tests known to CTest, one by one. In a cross build
# the program is one test: starting the emulator costs more than most tests.
include(GoogleTest)

function(vesk_gtest program)
  if(CMAKE_CROSSCOMPILING)
    add_test(NAME ${program} COMMAND ${program})
    set_tests_properties(${program} PROPERTIES LABELS unit TIMEOUT 300)
  else()
    gtest_discover_tests(${program} PROPERTIES LABELS unit TIMEOUT 60)
  endif()
endfunction()
