# `cpack -G DEB` in the build tree: one package with the program, its data,
# the helper service and the desktop files, whose dependencies dpkg-shlibdeps
# reads off the programs.
set(CPACK_PACKAGE_NAME tavik-fwupdater)
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION})
set(CPACK_PACKAGE_VENDOR "tavik-fwupdater")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "firmware updater for pen tablets and pen displays")
set(CPACK_PACKAGING_INSTALL_PREFIX ${CMAKE_INSTALL_PREFIX})
set(CPACK_STRIP_FILES ON)
set(CPACK_GENERATOR DEB)

set(CPACK_DEBIAN_PACKAGE_MAINTAINER "tavik-fwupdater maintainers <fwupdater@tavik.example>")
set(CPACK_DEBIAN_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# CPack puts the summary first and turns the empty line into " .".
set(CPACK_PACKAGE_DESCRIPTION "Finds an attached tablet or pen display over USB, takes it from the tablet
driver and programs its pen controller, touch controller, Bluetooth module
or display scalar, in a window or headless. A lab of emulated products
shows an update without hardware.

A udev rule opens the family's devices to the user at the seat, and a
helper service on the system bus stops and starts the tablet driver.")

# Maintainer scripts, and the example configuration below /etc kept as the
# administrator's file.
set(tav_debian ${CMAKE_BINARY_DIR}/debian)
configure_file(${CMAKE_CURRENT_LIST_DIR}/debian/postinst ${tav_debian}/postinst COPYONLY)
configure_file(${CMAKE_CURRENT_LIST_DIR}/debian/postrm ${tav_debian}/postrm COPYONLY)
file(WRITE ${tav_debian}/conffiles "${CMAKE_INSTALL_FULL_SYSCONFDIR}/tavik/update-helper.conf.example\n")
set(CPACK_DEBIAN_PACKAGE_CONTROL_EXTRA ${tav_debian}/postinst ${tav_debian}/postrm ${tav_debian}/conffiles)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)

# Debian wants the changelog of a native package compressed, reproducibly.
find_program(GZIP gzip REQUIRED)
configure_file(${CMAKE_CURRENT_LIST_DIR}/debian/changelog.in ${tav_debian}/changelog @ONLY)
add_custom_command(OUTPUT ${tav_debian}/changelog.gz
  COMMAND ${GZIP} -9nc ${tav_debian}/changelog > ${tav_debian}/changelog.gz
  DEPENDS ${tav_debian}/changelog
  VERBATIM)
add_custom_target(tav_debian_changelog ALL DEPENDS ${tav_debian}/changelog.gz)
install(FILES ${tav_debian}/changelog.gz DESTINATION ${CMAKE_INSTALL_DOCDIR})

include(CPack)
