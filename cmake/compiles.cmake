# qori_compiles(name FOLDERS folders... OPTIONS options... SOURCES sources...): each source compiles. The objects are of no
# use, so the compiler is clang where it is installed, which reads the vector intrinsics in a third of gcc's time; and
# only once, as a module that its own installation describes. Sources that do not include them still do not see them.
find_program(QORI_CLANG NAMES clang++-14 clang++)
set(qori_compiles_launcher ${CMAKE_CXX_COMPILER_LAUNCHER})
if(QORI_CLANG AND QORI_CCACHE)
    # It keeps results with modules only where it trusts the compiler's list of what was read.
    set(qori_compiles_launcher ${CMAKE_COMMAND} -E env CCACHE_DEPEND=1
        CCACHE_SLOPPINESS=time_macros,modules ${QORI_CCACHE})
endif()
function(qori_compiles name)
    cmake_parse_arguments(PARSE_ARGV 1 that "" "" "FOLDERS;OPTIONS;SOURCES")
    list(TRANSFORM that_FOLDERS PREPEND -I)
    set(compiler $<IF:$<BOOL:${QORI_CLANG}>,${QORI_CLANG},${CMAKE_CXX_COMPILER}>)
    set(warnings -Wall -Wextra -Wshadow -Wno-unused-function $<$<BOOL:${QORI_WERROR}>:-Werror>)
    if(QORI_CLANG)
        list(APPEND that_OPTIONS -fmodules -fmodules-cache-path=modules)
    endif()
    set(objects "")
    foreach(source IN LISTS that_SOURCES)
        cmake_path(GET source STEM stem)
        set(object ${CMAKE_CURRENT_BINARY_DIR}/${name}/${stem}.o)
        list(APPEND objects ${object})
        add_custom_command(OUTPUT ${object} DEPENDS ${source} DEPFILE ${object}.d VERBATIM COMMAND_EXPAND_LISTS
            COMMAND ${qori_compiles_launcher} ${compiler} -std=c++20 -O0 -mavx2 -mfma ${warnings} ${that_OPTIONS}
                ${that_FOLDERS} -MD -MF ${object}.d -o ${object} -c ${source}
            COMMAND ${CMAKE_COMMAND} -E touch ${object}
            COMMENT "Compiling ${name}: ${stem}")
    endforeach()
    file(MAKE_DIRECTORY ${CMAKE_CURRENT_BINARY_DIR}/${name})
    add_custom_target(${name} ALL DEPENDS ${objects})
endfunction()
