# vesk_module(<name> SOURCES <file>... [DEPENDS <target>...])
#
# One module of the tool: a few source files compiled together, with every module and library whose
# headers they use named in DEPENDS. All modules end in the one static library `veskcachepin`.
function(vesk_module name)
  cmake_parse_arguments(PARSE_ARGV 1 ARG "" "" "SOURCES;DEPENDS")
  if(ARG_UNPARSED_ARGUMENTS OR NOT ARG_SOURCES)
    message(FATAL_ERROR "vesk_module(${name}): SOURCES [and DEPENDS] expected")
  endif()
  add_library(${name} OBJECT ${ARG_SOURCES})
  target_include_directories(${name} PUBLIC ${PROJECT_SOURCE_DIR}/src)
  target_link_libraries(${name} PUBLIC vesk::options ${ARG_DEPENDS})
  target_link_libraries(veskcachepin PUBLIC ${name})
endfunction()
