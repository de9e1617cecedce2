# SPDX-License-Identifier: MIT
# What starts the service on demand: the units for the user's systemd and the file for the session bus. The build tree
# has them too, where XDG_DATA_DIRS=<build>/share finds them, with the path of the program that was built.

# install_naming_brivod(TEMPLATE BUILT DESTINATION): the template with the path of brivod.
function(install_naming_brivod template built destination)
  cmake_path(GET template STEM LAST_ONLY name)
  set(BRIVOD_PROGRAM ${CMAKE_RUNTIME_OUTPUT_DIRECTORY}/brivod)
  configure_file(${template} ${CMAKE_BINARY_DIR}/${built}/${name} @ONLY)
  # The prefix is known when it is installed: cmake --install may be given another one.
  install(CODE "
    set(BRIVOD_PROGRAM \"\${CMAKE_INSTALL_PREFIX}/${CMAKE_INSTALL_BINDIR}/brivod\")
    set(file \"${CMAKE_CURRENT_BINARY_DIR}/${built}/${name}\")
    configure_file(\"${CMAKE_CURRENT_SOURCE_DIR}/${template}\" \"\${file}\" @ONLY)
    file(INSTALL \"\${file}\" DESTINATION \"\${CMAKE_INSTALL_PREFIX}/${destination}\")"
    COMPONENT daemon)
endfunction()

install_naming_brivod(systemd/brivod.service.in share/systemd/user lib/systemd/user)
install_naming_brivod(dbus/org.orvid.brivod.service.in share/dbus-1/services ${CMAKE_INSTALL_DATADIR}/dbus-1/services)

configure_file(systemd/brivod.socket ${CMAKE_BINARY_DIR}/share/systemd/user/brivod.socket COPYONLY)
install(FILES systemd/brivod.socket DESTINATION lib/systemd/user COMPONENT daemon)
configure_file(systemd/brivod-generator ${CMAKE_BINARY_DIR}/lib/systemd/user-generators/brivod-generator COPYONLY)
install(PROGRAMS systemd/brivod-generator DESTINATION lib/systemd/user-generators COMPONENT daemon)
