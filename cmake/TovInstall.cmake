# What `cmake --install` puts where: the library, its two headers, the tool, the licence, a CMake package that defines
# tov::tov, and a pkg-config file.
include(CMakePackageConfigHelpers)

install(
    TARGETS tov
    EXPORT tovTargets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
    RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
install(FILES api/tov/tov.h api/tov/types.h DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/tov)
install(FILES LICENSE DESTINATION ${CMAKE_INSTALL_DOCDIR})
if(TARGET tov_tool)
    install(TARGETS tov_tool RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
endif()

set(package_directory ${CMAKE_INSTALL_LIBDIR}/cmake/tov)
install(
    EXPORT tovTargets
    NAMESPACE tov::
    FILE tovConfig.cmake
    DESTINATION ${package_directory})
write_basic_package_version_file(${PROJECT_BINARY_DIR}/tovConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/tovConfigVersion.cmake DESTINATION ${package_directory})

# The way from the pkg-config file up to the prefix depends on how deep the library directory is ("lib", "lib/<triplet>").
string(REGEX REPLACE "[^/]+" ".." tov_up "${CMAKE_INSTALL_LIBDIR}/pkgconfig")
configure_file(cmake/tov.pc.in tov.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/tov.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
