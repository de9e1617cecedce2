# SPDX-License-Identifier: MIT
# brivod_library(NAME FOLDER SOURCES file... [LINKS target...] [PRIVATE_LINKS target...])
#
# One static library per folder of src/. Its headers are visible under their path from src/ only to the
# targets that name it in their link list (through one directory per library that holds a single link),
# so an include against the order of the folders does not build.
function(brivod_library name folder)
  cmake_parse_arguments(arg "" "" "SOURCES;LINKS;PRIVATE_LINKS" ${ARGN})
  set(root ${CMAKE_BINARY_DIR}/include/${name})
  cmake_path(GET folder PARENT_PATH parent)
  file(MAKE_DIRECTORY ${root}/${parent})
  file(CREATE_LINK ${PROJECT_SOURCE_DIR}/src/${folder} ${root}/${folder} SYMBOLIC)

  if(arg_SOURCES)
    add_library(${name} STATIC ${arg_SOURCES})
    target_include_directories(${name} PUBLIC ${root})
    target_link_libraries(${name} PUBLIC ${arg_LINKS} PRIVATE ${arg_PRIVATE_LINKS})
  else()  # headers alone
    add_library(${name} INTERFACE)
    target_include_directories(${name} INTERFACE ${root})
    target_link_libraries(${name} INTERFACE ${arg_LINKS})
  endif()
endfunction()
