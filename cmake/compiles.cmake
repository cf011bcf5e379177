# qori_compiles(name FOLDERS folders... OPTIONS options... SOURCES sources...): each source compiles. The objects are of no
# use, so the compiler is clang where it is installed, which reads the vector intrinsics in a third of gcc's time.
find_program(QORI_CLANG NAMES clang++-14 clang++)
function(qori_compiles name)
    cmake_parse_arguments(PARSE_ARGV 1 that "" "" "FOLDERS;OPTIONS;SOURCES")
    list(TRANSFORM that_FOLDERS PREPEND -I)
    set(compiler $<IF:$<BOOL:${QORI_CLANG}>,${QORI_CLANG},${CMAKE_CXX_COMPILER}>)
    set(warnings -Wall -Wextra -Wshadow -Wno-unused-function $<$<BOOL:${QORI_WERROR}>:-Werror>)
    set(objects "")
    foreach(source IN LISTS that_SOURCES)
        cmake_path(GET source STEM stem)
        set(object ${CMAKE_CURRENT_BINARY_DIR}/${name}/${stem}.o)
        list(APPEND objects ${object})
        add_custom_command(OUTPUT ${object} DEPENDS ${source} DEPFILE ${object}.d VERBATIM COMMAND_EXPAND_LISTS
            COMMAND ${CMAKE_CXX_COMPILER_LAUNCHER} ${compiler} -std=c++20 -O0 -mavx2 -mfma ${warnings} ${that_OPTIONS}
                ${that_FOLDERS} -MD -MF ${object}.d -o ${object} -c ${source}
            COMMENT "Compiling ${name}: ${stem}")
    endforeach()
    file(MAKE_DIRECTORY ${CMAKE_CURRENT_BINARY_DIR}/${name})
    add_custom_target(${name} ALL DEPENDS ${objects})
endfunction()
