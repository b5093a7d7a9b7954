# The Debian package: scripts/package builds it.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME zeb)
set(CPACK_PACKAGE_VENDOR zeb)
set(CPACK_PACKAGE_CONTACT "zeb maintainers <maintainers@zeb.invalid>"
    CACHE STRING "Who is named as maintainer of the package")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "search in the help books of the desktop")
set(CPACK_PACKAGE_DESCRIPTION
    "Type a few words, or half a word, and get the right help page of any
installed application at once. Searches the help of the desktop's applications,
the manuals on the computer, and books on web servers, by words and by meaning,
for people at a terminal and, over the session bus, for programs.")
set(CPACK_PACKAGE_DIRECTORY ${CMAKE_BINARY_DIR}/packages)
set(CPACK_STRIP_FILES ON)
# Units and service files name the daemon where it will be, not where it is collected.
set(CPACK_SET_DESTDIR ON)

set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS
    ${CMAKE_BINARY_DIR}/platform ${CMAKE_BINARY_DIR}/host/Zebrine ${CMAKE_BINARY_DIR}/host/Luxwell)
set(CPACK_DEBIAN_PACKAGE_RECOMMENDS
    "ca-certificates, default-dbus-session-bus | dbus-session-bus")
set(CPACK_DEBIAN_PACKAGE_SUGGESTS "xdg-utils")
set(CPACK_DEBIAN_COMPRESSION_TYPE xz)

# What policy asks of a package and an installation by hand does not need.
set(CPACK_PRE_BUILD_SCRIPTS ${CMAKE_CURRENT_LIST_DIR}/PreparePackage.cmake)
set(CPACK_ZEB_CHANGELOG ${PROJECT_SOURCE_DIR}/install/changelog)

include(CPack)
