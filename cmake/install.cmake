# Headers, libraries, a CMake package (find_package(qori), targets qori::qorik5 and qori::qorcore), a pkg-config file,
# documentation.
include(CMakePackageConfigHelpers)

install(FILES include/qori.h include/qori.hpp core/qorcore.h DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(FILES README.md LICENSE DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(FILES docs/design.md DESTINATION ${CMAKE_INSTALL_DOCDIR}/docs)
install(DIRECTORY ${PROJECT_BINARY_DIR}/generated/reference DESTINATION ${CMAKE_INSTALL_DOCDIR})

if(WIN32)
    install(FILES $<TARGET_FILE:qorik5> $<TARGET_FILE:qorcore> DESTINATION ${CMAKE_INSTALL_BINDIR})
    install(FILES ${PROJECT_BINARY_DIR}/bin/libqorik5-8.2.dll.a ${PROJECT_BINARY_DIR}/bin/libqorcore-8.2.dll.a
        DESTINATION ${CMAKE_INSTALL_LIBDIR})
    # From which other tool chains make an import library.
    install(FILES ${PROJECT_BINARY_DIR}/generated/imports.def DESTINATION ${CMAKE_INSTALL_LIBDIR} RENAME qorik5-8.2.def)
    install(FILES core/qorcore_imports.def DESTINATION ${CMAKE_INSTALL_LIBDIR} RENAME qorcore-8.2.def)
    set(link_name qorik5-8.2)
else()
    set_target_properties(qorik5 PROPERTIES INSTALL_RPATH "$ORIGIN")
    install(TARGETS qorik5 qorcore LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
    set(link_name qorik5)
endif()

# Both packages find the installation from where they stand, so it may be moved.
set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/qori)
configure_package_config_file(cmake/qoriConfig.cmake.in ${PROJECT_BINARY_DIR}/qoriConfig.cmake
    INSTALL_DESTINATION ${package_dir} PATH_VARS CMAKE_INSTALL_INCLUDEDIR CMAKE_INSTALL_LIBDIR CMAKE_INSTALL_BINDIR)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/qoriConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/qoriConfig.cmake ${PROJECT_BINARY_DIR}/qoriConfigVersion.cmake DESTINATION ${package_dir})

file(RELATIVE_PATH prefix_from_pc /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
configure_file(cmake/qorik5.pc.in ${PROJECT_BINARY_DIR}/qorik5.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/qorik5.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
