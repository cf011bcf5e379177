# The C++ header: called by every member, refused in few lines, costing nothing, without warnings, without exceptions.
set(door ${CMAKE_CURRENT_SOURCE_DIR}/cpp_door)
set(door_include ${PROJECT_SOURCE_DIR}/include)

# With exceptions, without, and of a later standard; run where the library runs.
foreach(flavour throws ends later)
    add_executable(door_${flavour} ${door}/exceptions.cpp)
    target_link_libraries(door_${flavour} PRIVATE qorik5_link qori_warnings)
    target_compile_options(door_${flavour} PRIVATE -Wconversion -Wshadow -pedantic)
    target_link_options(door_${flavour} PRIVATE $<$<PLATFORM_ID:Windows>:-static>)
    set_target_properties(door_${flavour} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/bin CXX_STANDARD 17)
    add_test(NAME door_${flavour} COMMAND door_${flavour})
endforeach()
target_compile_options(door_ends PRIVATE -fno-exceptions -fno-rtti)
set_target_properties(door_later PROPERTIES CXX_STANDARD 20)

# The examples.
if(TARGET first)
    add_test(NAME door_first_example COMMAND first)
    set_tests_properties(door_first_example PROPERTIES PASS_REGULAR_EXPRESSION "green: 255")
endif()
if(TARGET matrix)
    add_test(NAME door_matrix_example COMMAND matrix)
    set_tests_properties(door_matrix_example PROPERTIES PASS_REGULAR_EXPRESSION "^0 [0-9]+ 200")
endif()

if(WIN32)
    return()
endif()
add_test(NAME door_generator COMMAND ${python} ${door}/generator_test.py)
set(door_compilers ${CMAKE_CXX_COMPILER} $<$<BOOL:${QORI_CLANG}>:${QORI_CLANG}>)

# Every member, over a library that only remembers.
set(calls ${CMAKE_CURRENT_BINARY_DIR}/cpp_door)
set(call_files 6)
math(EXPR last "${call_files} - 1")
set(call_sources ${calls}/recorded.cpp ${calls}/calls.cpp)
foreach(number RANGE ${last})
    list(APPEND call_sources ${calls}/calls_${number}.cpp)
endforeach()
file(GLOB door_generators ${PROJECT_SOURCE_DIR}/tools/*.py)
file(GLOB door_registry ${PROJECT_SOURCE_DIR}/api/*.toml)
add_custom_command(OUTPUT ${calls}/calls.stamp BYPRODUCTS ${call_sources}
    COMMAND ${python} ${door}/every_member.py ${calls} ${call_files}
    COMMAND ${CMAKE_COMMAND} -E touch ${calls}/calls.stamp
    DEPENDS ${door}/every_member.py ${door_generators} ${door_registry} VERBATIM)
add_custom_target(door_call_sources DEPENDS ${calls}/calls.stamp)
add_executable(door_calls ${call_sources} ${door}/recorder.cpp)
add_dependencies(door_calls door_call_sources)
target_include_directories(door_calls PRIVATE ${door_include} ${door})
target_link_libraries(door_calls PRIVATE qori_warnings)
target_compile_options(door_calls PRIVATE -O0 -g0)
set_target_properties(door_calls PROPERTIES CXX_STANDARD 17)
add_test(NAME door_calls COMMAND door_calls)

add_test(NAME door_misuses COMMAND ${python} ${door}/misuses.py ${door_include} ${door_compilers})
add_test(NAME door_same_code COMMAND ${python} ${door}/same_code.py ${door_include} ${door}/same_code.cpp ${door_compilers})
add_test(NAME door_compiles COMMAND ${python} ${door}/compiles.py ${door_include}
    ${door}/same_code.cpp:${door}/exceptions.cpp:${PROJECT_SOURCE_DIR}/examples/cpp/first.cpp ${calls}/calls_0.cpp
    ${door_compilers})
