# Compares the symbols that LIBRARY defines for others with the list in the file EXPECTED (sorted, one
# demangled name a line), using the tool NM.
execute_process(COMMAND ${NM} --dynamic --defined-only --demangle --format=posix ${LIBRARY}
                OUTPUT_VARIABLE listing COMMAND_ERROR_IS_FATAL ANY)
string(REPLACE "\n" ";" lines "${listing}")
set(found "")
foreach(line IN LISTS lines)
  # Name, type letter, value and size; a name may hold blanks.
  if(line MATCHES "^(.+) [A-Za-z] [0-9a-f]+( [0-9a-f]+)?$")
    list(APPEND found "${CMAKE_MATCH_1}")
  endif()
endforeach()
list(REMOVE_DUPLICATES found) # the destructor has several entry points of one name
list(SORT found)
file(STRINGS ${EXPECTED} expected)
if(NOT found STREQUAL expected)
  string(REPLACE ";" "\n  " found "${found}")
  string(REPLACE ";" "\n  " expected "${expected}")
  message(FATAL_ERROR "${LIBRARY} exports\n  ${found}\ninstead of\n  ${expected}")
endif()
