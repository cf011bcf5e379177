# Compiler settings shared by all targets.
set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_C_STANDARD 99)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_C_VISIBILITY_PRESET hidden)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(QORI_SANITIZE OFF CACHE STRING "ON: address and undefined-behaviour sanitizers; thread: data races")
option(QORI_WERROR "Treat warnings as errors" OFF)

find_program(QORI_CCACHE ccache)
if(QORI_CCACHE)
    # Without these a precompiled header keeps its users out of the cache.
    set(launcher ${CMAKE_COMMAND} -E env CCACHE_SLOPPINESS=pch_defines,time_macros ${QORI_CCACHE})
    set(CMAKE_C_COMPILER_LAUNCHER ${launcher})
    set(CMAKE_CXX_COMPILER_LAUNCHER ${launcher})
endif()

add_library(qori_warnings INTERFACE)
target_compile_options(qori_warnings INTERFACE
    $<$<COMPILE_LANGUAGE:C,CXX>:-Wall -Wextra -Wshadow -Wconversion>
    $<$<AND:$<BOOL:${QORI_WERROR}>,$<COMPILE_LANGUAGE:C,CXX>>:-Werror>)

# The processor the library is built for, and floating-point arithmetic that means what it says.
add_library(qori_target INTERFACE)
target_compile_options(qori_target INTERFACE
    $<$<COMPILE_LANGUAGE:C,CXX>:-mavx2 -mfma -ffp-contract=off -fno-math-errno>)
if(WIN32 AND CMAKE_SIZEOF_VOID_P EQUAL 4)
    # Callers align the stack to 4 bytes only.
    target_compile_options(qori_target INTERFACE $<$<COMPILE_LANGUAGE:C,CXX>:-mfpmath=sse -mstackrealign>)
elseif(WIN32)
    # Callers align the stack to 16 bytes, and the compiler cannot align it further where there are unwind tables. Debian's
    # knows and moves vectors of 32 bytes as unaligned ones; others do not, so the assembler encodes all moves like that.
    target_compile_options(qori_target INTERFACE $<$<COMPILE_LANGUAGE:C,CXX>:-Wa,-muse-unaligned-vector-move>)
endif()
if(QORI_SANITIZE STREQUAL "thread")
    add_compile_options("$<$<COMPILE_LANGUAGE:C,CXX>:-fsanitize=thread>")
    add_link_options(-fsanitize=thread)
elseif(QORI_SANITIZE)
    # Unaligned elements are part of the contract (steps of any value). The address sanitizer sees null and stray pointers
    # itself; its checks are calls, and the ends of scopes are not followed, which every inlined intrinsic would have
    # some of: either halves the time that large kernels take to compile.
    set(sanitizers -fsanitize=address,undefined -fno-sanitize=alignment,null,object-size,vptr,pointer-overflow
        -fno-sanitize-recover=all -fno-sanitize-address-use-after-scope -fno-omit-frame-pointer
        --param asan-instrumentation-with-call-threshold=0)
    add_compile_options("$<$<COMPILE_LANGUAGE:C,CXX>:${sanitizers}>")
    add_link_options(-fsanitize=address,undefined)
endif()

# No C++ runtime: neither exceptions nor type information nor guarded statics nor heap. Unwind tables only where the
# system requires them of every function that is not a leaf.
set(unwind_tables -fno-asynchronous-unwind-tables)
if(WIN32 AND CMAKE_SIZEOF_VOID_P EQUAL 8)
    set(unwind_tables -fasynchronous-unwind-tables)
endif()
add_library(qori_freestanding INTERFACE)
target_compile_options(qori_freestanding INTERFACE
    $<$<COMPILE_LANGUAGE:CXX>:-fno-exceptions -fno-rtti -fno-threadsafe-statics ${unwind_tables}>
    # Kernels are vector code already; packing their pointers into vectors only slows short rows down.
    $<$<COMPILE_LANGUAGE:CXX>:-fno-tree-slp-vectorize>
    # Where in a line a short loop begins decides up to a third of its time. What decides it should not be the size of
    # whatever code the linker puts before it.
    $<$<COMPILE_LANGUAGE:CXX>:-falign-functions=64>)
