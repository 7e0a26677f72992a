# What cmake --install (and the Debian package) puts where: the command, the library with its
# headers, CMake package and pkg-config file, the manual pages, the bash completion and the
# bundled example, which the installed command finds beside itself.
include(CMakePackageConfigHelpers)

install(TARGETS trllocator RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
install(TARGETS trllocator_library EXPORT trlLocatorTargets
        LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(DIRECTORY include/trl DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} FILES_MATCHING PATTERN "*.h")

set(TRL_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/trlLocator)
set(TRL_SHARED_LIBRARY ${BUILD_SHARED_LIBS})
install(EXPORT trlLocatorTargets NAMESPACE trlLocator:: DESTINATION ${TRL_CMAKE_DIR})
configure_package_config_file(cmake/trlLocatorConfig.cmake.in
                              ${PROJECT_BINARY_DIR}/trlLocatorConfig.cmake
                              INSTALL_DESTINATION ${TRL_CMAKE_DIR})
# Before 1.0 a minor release may change the interface, as the soname says.
write_basic_package_version_file(${PROJECT_BINARY_DIR}/trlLocatorConfigVersion.cmake
                                 COMPATIBILITY SameMinorVersion)
install(FILES ${PROJECT_BINARY_DIR}/trlLocatorConfig.cmake
              ${PROJECT_BINARY_DIR}/trlLocatorConfigVersion.cmake
        DESTINATION ${TRL_CMAKE_DIR})

# Paths as the configured prefix gives them, so that a staged install (DESTDIR) is read with
# PKG_CONFIG_SYSROOT_DIR. Only a static library needs the libraries it uses named.
foreach(kind LIBDIR INCLUDEDIR)
  if(IS_ABSOLUTE ${CMAKE_INSTALL_${kind}})
    set(TRL_PC_${kind} ${CMAKE_INSTALL_${kind}})
  else()
    set(TRL_PC_${kind} "\${prefix}/${CMAKE_INSTALL_${kind}}")
  endif()
endforeach()
if(BUILD_SHARED_LIBS)
  set(TRL_PC_PRIVATE "")
else()
  set(TRL_PC_PRIVATE "Requires.private: pugixml libpcre2-8 libutf8proc libcrypto sqlite3 fmt\nLibs.private: -pthread")
endif()
configure_file(cmake/trllocator.pc.in ${PROJECT_BINARY_DIR}/trllocator.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/trllocator.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

install(DIRECTORY ${PROJECT_BINARY_DIR}/share/man/ DESTINATION ${CMAKE_INSTALL_MANDIR})
install(FILES ${PROJECT_BINARY_DIR}/share/bash-completion/completions/trllocator
        DESTINATION ${CMAKE_INSTALL_DATADIR}/bash-completion/completions)
install(FILES examples/search-options.xml examples/application-options.xml examples/fingerprint.xml
        DESTINATION ${CMAKE_INSTALL_DATADIR}/trllocator/examples)
install(FILES README.md CHANGELOG.md LICENSE cmake/copyright DESTINATION ${CMAKE_INSTALL_DOCDIR})
