# One folder of sources: one library, and one list of the folders whose headers it may include.
#
# Headers are found through roots. The root of a folder is a directory of the build tree that holds
# nothing but a link of the folder's name, and a target's include path is made of the roots of the very
# folders that it names, whatever those use themselves: an include of any other folder does not compile.
# What the linker needs beyond them comes with the libraries.

# vesk_root(<folder>): makes the current source directory known under this name.
function(vesk_root folder)
  set(root ${CMAKE_BINARY_DIR}/roots/${folder})
  file(MAKE_DIRECTORY ${root})
  file(CREATE_LINK ${CMAKE_CURRENT_SOURCE_DIR} ${root}/${folder} SYMBOLIC)
endfunction()

# vesk_use(<target> [USES <folder>...] [LIBRARIES <target>...]): what any target of the project is built
# with. A folder must be listed before those that use it, so there is no circle.
function(vesk_use target)
  cmake_parse_arguments(PARSE_ARGV 1 ARG "" "" "USES;LIBRARIES")
  if(ARG_UNPARSED_ARGUMENTS)
    message(FATAL_ERROR "${target}: expected USES and LIBRARIES, not ${ARG_UNPARSED_ARGUMENTS}")
  endif()
  foreach(folder IN LISTS ARG_USES)
    if(NOT TARGET vesk_${folder})
      message(FATAL_ERROR "${target} uses ${folder}/, which is no folder listed before it")
    endif()
    target_include_directories(${target} PRIVATE ${CMAKE_BINARY_DIR}/roots/${folder})
    target_link_libraries(${target} PRIVATE vesk_${folder})
  endforeach()
  target_link_libraries(${target} PRIVATE vesk::options ${ARG_LIBRARIES})
endfunction()

# vesk_folder(<folder> [OBJECT] SOURCES <file>... [USES <folder>...] [LIBRARIES <target>...]): the library
# vesk_<folder>, a static one unless said otherwise, of the current source directory.
function(vesk_folder folder)
  cmake_parse_arguments(PARSE_ARGV 1 ARG "OBJECT" "" "SOURCES;USES;LIBRARIES")
  if(ARG_UNPARSED_ARGUMENTS OR NOT ARG_SOURCES)
    message(FATAL_ERROR "vesk_folder(${folder}): expected SOURCES, not ${ARG_UNPARSED_ARGUMENTS}")
  endif()
  set(kind STATIC)
  if(ARG_OBJECT)
    set(kind OBJECT)
  endif()
  vesk_root(${folder})
  add_library(vesk_${folder} ${kind} ${ARG_SOURCES})
  target_include_directories(vesk_${folder} PRIVATE ${CMAKE_BINARY_DIR}/roots/${folder})
  vesk_use(vesk_${folder} USES ${ARG_USES} LIBRARIES ${ARG_LIBRARIES})
endfunction()
