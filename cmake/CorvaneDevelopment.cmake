# Compiler options for Corvane's own targets only. They are applied as PRIVATE options, so a project that
# links corvane::corvane inherits none of them.

function(corvane_development_options target)
    target_compile_options(${target} PRIVATE -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor)
    if(CMAKE_CXX_COMPILER_ID MATCHES "Clang")
        target_compile_options(${target} PRIVATE -Wthread-safety -Wdeprecated)
    endif()
    if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
        # False alarms of g++ 12 about the standard library's strings and variants, in optimised builds.
        target_compile_options(${target} PRIVATE -Wno-restrict -Wno-maybe-uninitialized)
    endif()
    if(CORVANE_WERROR)
        target_compile_options(${target} PRIVATE -Werror)
    endif()
    if(CORVANE_SANITIZE)
        target_compile_options(${target} PRIVATE -fsanitize=${CORVANE_SANITIZE} -fno-omit-frame-pointer
            -fno-sanitize-recover=all)
        if(CORVANE_SANITIZE MATCHES "undefined")
            # Half of the compiler's time; a null pointer stops the address sanitizer too.
            target_compile_options(${target} PRIVATE -fno-sanitize=null,vptr)
        endif()
        target_link_options(${target} PRIVATE -fsanitize=${CORVANE_SANITIZE})
    endif()
    if(CORVANE_FUZZ_COVERAGE)
        target_compile_options(${target} PRIVATE -fprofile-instr-generate -fcoverage-mapping)
        target_link_options(${target} PRIVATE -fprofile-instr-generate)
    endif()
endfunction()
