# Headers, libraries, a CMake package (find_package(qori), target qori::qorik5), a pkg-config file, reference pages.
include(CMakePackageConfigHelpers)

install(FILES include/qori.h core/qorcore.h DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(DIRECTORY ${PROJECT_BINARY_DIR}/generated/reference/ DESTINATION ${CMAKE_INSTALL_DOCDIR}/reference)
install(FILES README.md LICENSE DESTINATION ${CMAKE_INSTALL_DOCDIR})

set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/qori)
configure_package_config_file(cmake/qoriConfig.cmake.in ${PROJECT_BINARY_DIR}/qoriConfig.cmake INSTALL_DESTINATION ${package_dir}
    PATH_VARS CMAKE_INSTALL_INCLUDEDIR CMAKE_INSTALL_LIBDIR CMAKE_INSTALL_BINDIR)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/qoriConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/qoriConfig.cmake ${PROJECT_BINARY_DIR}/qoriConfigVersion.cmake DESTINATION ${package_dir})

if(WIN32)
    install(FILES $<TARGET_FILE:qorik5> $<TARGET_FILE:qorcore> DESTINATION ${CMAKE_INSTALL_BINDIR})
    install(FILES ${PROJECT_BINARY_DIR}/bin/libqorik5-8.2.dll.a ${PROJECT_BINARY_DIR}/bin/libqorcore-8.2.dll.a
        ${PROJECT_BINARY_DIR}/generated/imports.def DESTINATION ${CMAKE_INSTALL_LIBDIR})
else()
    set_target_properties(qorik5 PROPERTIES INSTALL_RPATH "$ORIGIN")
    install(TARGETS qorik5 qorcore LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
    configure_file(cmake/qorik5.pc.in ${PROJECT_BINARY_DIR}/qorik5.pc @ONLY)
    install(FILES ${PROJECT_BINARY_DIR}/qorik5.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
endif()
