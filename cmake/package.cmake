# The Debian package, made by `cpack -G DEB` in a build configured with CMAKE_INSTALL_PREFIX=/usr:
# one package with everything cmake --install puts in place, its dependencies worked out by
# dpkg-shlibdeps from the binaries it holds.
set(CPACK_PACKAGE_NAME trllocator)
set(CPACK_PACKAGE_VENDOR "The trlLocator developers")
set(CPACK_PACKAGE_CONTACT "trlLocator developers <trllocator@example.org>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "${PROJECT_DESCRIPTION}")
set(CPACK_PACKAGE_DESCRIPTION
    "trllocator walks folders on local disks and network shares, matches the files it finds against \
an XML fingerprint database, filters ambiguous matches and merges the results into a running \
inventory of what is installed, with version history and missing applications. The package holds \
the command, the C++ library libtrllocator with its headers, CMake package and pkg-config file, \
manual pages, bash completion and a bundled example.")
set(CPACK_PACKAGING_INSTALL_PREFIX ${CMAKE_INSTALL_PREFIX})
set(CPACK_STRIP_FILES ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# A shlibs file for those who link libtrllocator, and the ldconfig trigger.
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS ON)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS_POLICY ">=")
set(CPACK_GENERATOR DEB)
include(CPack)
