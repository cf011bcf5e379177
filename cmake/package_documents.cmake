# Run by CPack when the components are installed and not yet packed: each package's change log, licence and bill of
# materials.
foreach(component IN LISTS CPACK_COMPONENTS_ALL)
    string(TOUPPER ${component} upper)
    execute_process(COMMAND ${CPACK_QORI_PYTHON} ${CPACK_QORI_SOURCE}/tools/debian_documents.py
        ${CPACK_TEMPORARY_DIRECTORY}/${component} ${CPACK_DEBIAN_${upper}_PACKAGE_NAME}
        ${CPACK_PACKAGE_VERSION} ${CPACK_DEBIAN_PACKAGE_RELEASE} ${CPACK_PACKAGE_CONTACT} COMMAND_ERROR_IS_FATAL ANY)
endforeach()
