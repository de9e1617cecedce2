# SPDX-License-Identifier: MIT
# Run by CPack on the packages it has made, for what it does not do itself: ldconfig is run by dpkg's trigger instead of
# by scripts of the package, Multi-Arch says what may be installed beside what, no folder has its mode from a umask, and
# packages of debug information are documented with their package and name no path of this machine.
function(run)
  execute_process(COMMAND ${ARGN} OUTPUT_QUIET COMMAND_ERROR_IS_FATAL ANY)
endfunction()

function(finish_debug_information folder package)
  run(sed -i "s|  /.*-dbgsym/|  |" ${folder}/DEBIAN/md5sums)
  file(MAKE_DIRECTORY ${folder}/usr/share/doc)
  file(CREATE_LINK ${package} ${folder}/usr/share/doc/${package}-dbgsym SYMBOLIC)
endfunction()

function(finish_package folder package)
  set(multi_arch foreign)
  if(package MATCHES "^lib")
    set(multi_arch same)
  endif()
  run(sed -i "s/^Package:/Multi-Arch: ${multi_arch}\\n&/" ${folder}/DEBIAN/control)
  if(EXISTS ${folder}/DEBIAN/shlibs)
    file(REMOVE ${folder}/DEBIAN/postinst ${folder}/DEBIAN/postrm)
    file(WRITE ${folder}/DEBIAN/triggers "activate-noawait ldconfig\n")
  endif()
endfunction()

foreach(file IN LISTS CPACK_PACKAGE_FILES)
  set(folder ${CPACK_TEMPORARY_DIRECTORY}/finish)
  file(REMOVE_RECURSE ${folder})
  run(dpkg-deb --raw-extract ${file} ${folder})
  if(file MATCHES "/([^/]*)-dbgsym_[^/]*$")
    finish_debug_information(${folder} ${CMAKE_MATCH_1})
  elseif(file MATCHES "/([^/]*)_[^/]*_[^/]*$")
    finish_package(${folder} ${CMAKE_MATCH_1})
  endif()
  run(find ${folder} -type d -exec chmod 755 {} +)
  run(dpkg-deb --root-owner-group -Z${CPACK_DEBIAN_COMPRESSION_TYPE} --build ${folder} ${file})
endforeach()
