# Checks of the built files and of the tests themselves.
set(python ${Python3_EXECUTABLE})
set(checks ${CMAKE_CURRENT_SOURCE_DIR}/checks)

# What reads the repository's files finds the same for every system.
if(NOT WIN32)
    add_test(NAME apigen COMMAND ${python} ${checks}/apigen_test.py)
    add_test(NAME interface COMMAND ${python} ${checks}/interface_test.py)
    add_test(NAME docs_generator COMMAND ${python} ${checks}/docs_test.py)
    add_test(NAME layers COMMAND ${python} ${checks}/layers.py ${PROJECT_SOURCE_DIR})
    add_test(NAME header_is_current COMMAND ${python} ${checks}/header_is_current.py ${PROJECT_SOURCE_DIR})
    add_test(NAME readme_is_current COMMAND ${python} ${checks}/readme_is_current.py ${PROJECT_SOURCE_DIR}/README.md
        ${PROJECT_SOURCE_DIR}/examples/python/first_steps.py ${PROJECT_SOURCE_DIR}/examples/cpp/first.cpp)
endif()
if(WIN32)
    add_test(NAME dll_tables COMMAND ${python} ${checks}/dll_tables.py ${CMAKE_OBJDUMP} $<TARGET_FILE:qorik5>
        ${PROJECT_BINARY_DIR}/generated/exports.txt)
    if(CMAKE_SIZEOF_VOID_P EQUAL 8)
        foreach(library qorik5 qorcore)
            add_test(NAME ${library}_code COMMAND ${python} ${checks}/win64_code.py ${CMAKE_OBJDUMP} $<TARGET_FILE:${library}>)
        endforeach()
    endif()
elseif(NOT QORI_SANITIZE)
    add_test(NAME elf_tables COMMAND ${python} ${checks}/elf_tables.py $<TARGET_FILE:qorik5>
        ${PROJECT_BINARY_DIR}/generated/exports.txt)
endif()

# Every export has been compared with its reference by one of the test binaries of this run, which are all there.
if(NOT QORI_TESTS)
    get_property(tests GLOBAL PROPERTY qori_tests)
    list(TRANSFORM tests REPLACE "(.+)" "swept_\\1.txt")
    add_test(NAME all_exports_swept COMMAND ${python} ${checks}/all_exports_swept.py ${PROJECT_BINARY_DIR}/generated/exports.txt ${tests})
    set_tests_properties(all_exports_swept PROPERTIES FIXTURES_REQUIRED swept)
endif()

# The header stands alone in C99 and C++, and a program in each links.
foreach(language c cpp)
    add_executable(header_${language} checks/header.${language})
    target_compile_options(header_${language} PRIVATE -Wall -Wextra -Wpedantic -Werror)
    target_link_libraries(header_${language} PRIVATE qorik5_link)
    target_link_options(header_${language} PRIVATE $<$<PLATFORM_ID:Windows>:-static>)
    set_target_properties(header_${language} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/bin)
    add_test(NAME header_${language} COMMAND header_${language})
endforeach()

add_executable(companion checks/companion.cpp)
target_link_libraries(companion PRIVATE qorcore_link qori_warnings)
target_link_options(companion PRIVATE $<$<PLATFORM_ID:Windows>:-static>)
set_target_properties(companion PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/bin)
add_test(NAME companion COMMAND companion)

# Several threads with one plan, on tiles of one image or on images of their own; the preset tsan watches them.
find_package(Threads REQUIRED)
foreach(family resize warp dft)
    add_executable(${family}_threads checks/${family}_threads.cpp)
    target_link_libraries(${family}_threads PRIVATE qorik5_link qori_warnings Threads::Threads)
    target_link_options(${family}_threads PRIVATE $<$<PLATFORM_ID:Windows>:-static>)
    set_target_properties(${family}_threads PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/bin)
    add_test(NAME ${family}_threads COMMAND ${family}_threads)
endforeach()

# The README's example is compiled and run as it stands there.
set(readme ${PROJECT_SOURCE_DIR}/README.md)
set(example ${CMAKE_CURRENT_BINARY_DIR}/readme_example.c)
add_custom_command(OUTPUT ${example} COMMAND ${python} ${checks}/readme_example.py ${readme} ${example}
    DEPENDS ${readme} ${checks}/readme_example.py VERBATIM)
add_executable(readme_example ${example})
target_link_libraries(readme_example PRIVATE qorik5_link)
set_target_properties(readme_example PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/bin)
add_test(NAME readme_example COMMAND readme_example)
set_tests_properties(readme_example PROPERTIES PASS_REGULAR_EXPRESSION "green of pixel \\(9, 9\\): 128")

# Every header of the library compiles alone, and all of them in one source: names that mean two things show there.
if(NOT WIN32)
    set(headers_folder ${CMAKE_CURRENT_BINARY_DIR}/headers)
    file(GLOB_RECURSE headers CONFIGURE_DEPENDS RELATIVE ${PROJECT_SOURCE_DIR}/src ${PROJECT_SOURCE_DIR}/src/*.h)
    list(FILTER headers EXCLUDE REGEX "entry_macros.h$")
    set(together "")
    foreach(header IN LISTS headers)
        string(MAKE_C_IDENTIFIER ${header} name)
        file(CONFIGURE OUTPUT ${headers_folder}/${name}.cpp CONTENT "#include \"${header}\"\n")
        list(APPEND header_sources ${headers_folder}/${name}.cpp)
        string(APPEND together "#include \"${header}\"\n")
    endforeach()
    file(CONFIGURE OUTPUT ${headers_folder}/together.cpp CONTENT "${together}")
    qori_compiles(headers_alone FOLDERS ${PROJECT_SOURCE_DIR}/include ${PROJECT_SOURCE_DIR}/core ${PROJECT_SOURCE_DIR}/src
        OPTIONS -fno-exceptions -fno-rtti SOURCES ${header_sources} ${headers_folder}/together.cpp)
endif()

# The demo ends with a sheet, however small the picture, or with the reason why not.
if(TARGET demo AND NOT WIN32)
    find_file(QORI_TYPEFACE DejaVuSans.ttf PATHS /usr/share/fonts/truetype/dejavu NO_CMAKE_FIND_ROOT_PATH)
    if(NOT QORI_TYPEFACE)
        message(FATAL_ERROR "DejaVuSans.ttf is missing: install fonts-dejavu-core, or set QORI_TYPEFACE")
    endif()
    add_test(NAME demo_pictures COMMAND ${python} ${checks}/demo_pictures.py $<TARGET_FILE:demo> ${QORI_TYPEFACE})
endif()
