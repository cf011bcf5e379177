# Debian packages of the installed components, by CPack; scripts/package runs it.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME qori)
set(CPACK_PACKAGE_VENDOR "qori developers")
set(CPACK_PACKAGE_CONTACT "qori developers <developers@qori.invalid>")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_COMPONENTS_ALL runtime development documentation)
if(TARGET qori_python)
    list(APPEND CPACK_COMPONENTS_ALL python)
endif()
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_RELEASE 1)
set(CPACK_PRE_BUILD_SCRIPTS ${PROJECT_SOURCE_DIR}/cmake/package_documents.cmake)
set(CPACK_QORI_SOURCE ${PROJECT_SOURCE_DIR})
set(CPACK_QORI_PYTHON ${Python3_EXECUTABLE})

# qori_package(component name section summary text): the text has lines of at most 80 characters.
macro(qori_package component name section summary text)
    string(TOUPPER ${component} upper)
    set(CPACK_DEBIAN_${upper}_PACKAGE_NAME ${name})
    set(CPACK_DEBIAN_${upper}_PACKAGE_SOURCE qori)
    set(CPACK_DEBIAN_${upper}_PACKAGE_SECTION ${section})
    set(CPACK_DEBIAN_${upper}_DESCRIPTION "${summary}
Some 2,500 C functions over two-dimensional images in the caller's memory:
arithmetic, statistics, filters, morphology, resizing, warps, transforms,
matching. Results are exact or bounded, and depend neither on alignment nor
on width nor on the rounding mode. Needs a processor with AVX2 and FMA.
.
${text}")
endmacro()
qori_package(runtime libqorik5-8 libs "image-processing primitives (library)"
    "This package has the library and its companion.")
qori_package(development libqori-dev libdevel "image-processing primitives (development files)"
    "This package has the headers, and files for CMake and pkg-config.")
qori_package(documentation qori-doc doc "image-processing primitives (documentation)"
    "This package has a page for each family of operations.")
qori_package(python python3-qori python "image-processing primitives (Python 3)"
    "This package has a function for each operation, over arrays of NumPy or
of anything else that has a buffer.")

# Dependencies are stated, not found: scripts/package checks that no symbol is of a later version of glibc.
configure_file(packaging/shlibs.in ${PROJECT_BINARY_DIR}/packaging/shlibs @ONLY)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_DEPENDS "libc6 (>= 2.17)")
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA ${PROJECT_SOURCE_DIR}/packaging/triggers
    ${PROJECT_BINARY_DIR}/packaging/shlibs)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(this_library "libqorik5-8 (= ${PROJECT_VERSION}-${CPACK_DEBIAN_PACKAGE_RELEASE})")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS ${this_library})
set(CPACK_DEBIAN_PYTHON_PACKAGE_DEPENDS "${this_library}, python3 (>= 3.11), libc6 (>= 2.14)")
set(CPACK_DEBIAN_PYTHON_PACKAGE_RECOMMENDS python3-numpy)
set(CPACK_DEBIAN_PYTHON_PACKAGE_CONTROL_EXTRA ${PROJECT_SOURCE_DIR}/packaging/python/postinst
    ${PROJECT_SOURCE_DIR}/packaging/python/prerm)
set(CPACK_DEBIAN_PYTHON_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_DOCUMENTATION_PACKAGE_ARCHITECTURE all)

# Only libraries are installed, and they are there.
set(CMAKE_SKIP_INSTALL_ALL_DEPENDENCY ON)
include(CPack)
