# The tests of another build over the sanitized libraries of this one.
execute_process(COMMAND ${CMAKE_CXX_COMPILER} -print-file-name=libasan.so OUTPUT_VARIABLE sanitizer
    OUTPUT_STRIP_TRAILING_WHITESPACE)
file(GLOB sources CONFIGURE_DEPENDS RELATIVE ${CMAKE_CURRENT_SOURCE_DIR} */*_test.cpp)
list(REMOVE_ITEM sources frame/unwind_test.cpp)
# Cases of many values, which touch the memory that their neighbours touch: half of all the time over slow libraries.
set(slow ResizeNumbers.ConstantsStay ResizeNumbers.NothingIsComputedOnTheBuffersGarbage
    ResizeNumbers.WorkMemoryFollowsTheDestination Median.EveryPatternOf5x5 Median.MajoritiesInTiles
    Norms.SumsOfSquaresPast64Bits Norms.SumsOfMorePixelsThan32BitsCount CountInRange.CountsPastEveryLane)
list(JOIN slow : slow)
# Of where a block came from one call is kept: the tests' own vectors took most of the time of some, each with a stack of
# thirty calls that are none, because their programs keep no frame pointers.
set(sanitized "LD_PRELOAD=${sanitizer};LD_LIBRARY_PATH=${bin}:${PROJECT_BINARY_DIR}/bin"
    "ASAN_OPTIONS=handle_segv=2:malloc_context_size=1" "UBSAN_OPTIONS=print_stacktrace=1"
    QORI_SHAPES_APART=3)
foreach(source IN LISTS sources)
    cmake_path(GET source STEM name)
    add_test(NAME ${name} COMMAND ${QORI_TEST_PROGRAMS}/${name} --gtest_brief=1)
    set_tests_properties(${name} PROPERTIES TIMEOUT 900 ENVIRONMENT "${sanitized};GTEST_FILTER=-${slow}")
endforeach()
add_test(NAME fuzz_briefly COMMAND ${QORI_TEST_PROGRAMS}/fuzz 1000000 3)
set_tests_properties(fuzz_briefly PROPERTIES ENVIRONMENT "${sanitized}")

# That the programs do run over the sanitized library: one that is not would find none of its symbols.
add_test(NAME sanitizer_is_there COMMAND ${CMAKE_COMMAND} -E env ${sanitized} LD_TRACE_LOADED_OBJECTS=1
    ${QORI_TEST_PROGRAMS}/fuzz)
set_tests_properties(sanitizer_is_there PROPERTIES PASS_REGULAR_EXPRESSION "${PROJECT_BINARY_DIR}/bin/libqorik5.so")
