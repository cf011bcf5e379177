# Headers, libraries, a CMake package (find_package(qori), targets qori::qorik5 and qori::qorcore), a pkg-config file,
# documentation; in components by who needs them: runtime, development, documentation.
include(CMakePackageConfigHelpers)

install(FILES include/qori.h include/qori.hpp core/qorcore.h DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development)
install(FILES README.md LICENSE CHANGELOG.md DESTINATION ${CMAKE_INSTALL_DOCDIR} COMPONENT documentation)
install(FILES docs/design.md DESTINATION ${CMAKE_INSTALL_DOCDIR}/docs COMPONENT documentation)
install(DIRECTORY ${PROJECT_BINARY_DIR}/generated/reference DESTINATION ${CMAKE_INSTALL_DOCDIR} COMPONENT documentation)

if(WIN32)
    install(FILES $<TARGET_FILE:qorik5> $<TARGET_FILE:qorcore> DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT runtime)
    # Names for debuggers, which look beside the DLL.
    install(FILES ${PROJECT_BINARY_DIR}/bin/qorik5-8.2.pdb ${PROJECT_BINARY_DIR}/bin/qorcore-8.2.pdb
        DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT development)
    install(FILES ${PROJECT_BINARY_DIR}/bin/libqorik5-8.2.dll.a ${PROJECT_BINARY_DIR}/bin/libqorcore-8.2.dll.a
        DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT development)
    # From which other tool chains make an import library, and MSVC's where the tool for it was there.
    install(FILES ${QORI_IMPORTS_qorik5} DESTINATION ${CMAKE_INSTALL_LIBDIR} RENAME qorik5-8.2.def COMPONENT development)
    install(FILES ${QORI_IMPORTS_qorcore} DESTINATION ${CMAKE_INSTALL_LIBDIR} RENAME qorcore-8.2.def COMPONENT development)
    if(QORI_LLVM_DLLTOOL)
        install(FILES ${PROJECT_BINARY_DIR}/bin/qorik5-8.2.lib ${PROJECT_BINARY_DIR}/bin/qorcore-8.2.lib
            DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT development)
    endif()
    set(link_name qorik5-8.2)
else()
    # The companion lies beside it, in the build too: no folder of the build gets into what is installed.
    set_target_properties(qorik5 PROPERTIES INSTALL_RPATH "$ORIGIN" BUILD_WITH_INSTALL_RPATH ON)
    install(TARGETS qorik5 qorcore LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT runtime
        NAMELINK_COMPONENT development)
    set(link_name qorik5)
endif()

# Both packages find the installation from where they stand, so it may be moved.
set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/qori)
configure_package_config_file(cmake/qoriConfig.cmake.in ${PROJECT_BINARY_DIR}/qoriConfig.cmake
    INSTALL_DESTINATION ${package_dir} PATH_VARS CMAKE_INSTALL_INCLUDEDIR CMAKE_INSTALL_LIBDIR CMAKE_INSTALL_BINDIR)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/qoriConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/qoriConfig.cmake ${PROJECT_BINARY_DIR}/qoriConfigVersion.cmake
    DESTINATION ${package_dir} COMPONENT development)

file(RELATIVE_PATH prefix_from_pc /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
configure_file(cmake/qorik5.pc.in ${PROJECT_BINARY_DIR}/qorik5.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/qorik5.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT development)
