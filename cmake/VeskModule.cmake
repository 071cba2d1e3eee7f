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

  file(RELATIVE_PATH folder ${PROJECT_SOURCE_DIR}/src ${CMAKE_CURRENT_SOURCE_DIR})
  list(TRANSFORM ARG_SOURCES PREPEND ${folder}/)
  set_property(GLOBAL APPEND_STRING PROPERTY VESK_MODULES
               "${name}: ${ARG_SOURCES}: ${ARG_DEPENDS}\n")
endfunction()

# Writes the module graph, a line each "name: sources: dependencies", for scripts/lint.
function(vesk_write_modules file)
  get_property(modules GLOBAL PROPERTY VESK_MODULES)
  file(WRITE ${file} "${modules}")
endfunction()
