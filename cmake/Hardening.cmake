# Makes a mistake end the process where it would otherwise open it. tests/structure/hardening_test.py
# looks for each of these in the files that were built.
include(CheckCXXCompilerFlag)

add_compile_options(-fstack-protector-strong)
add_link_options(-Wl,-z,relro,-z,now,-z,noexecstack)

# A stack that grows by more than a page touches each, so that it cannot jump over the guard.
check_cxx_compiler_flag(-fstack-clash-protection SSOCLIENT_HAS_STACK_CLASH_PROTECTION)
if(SSOCLIENT_HAS_STACK_CLASH_PROTECTION)
    add_compile_options(-fstack-clash-protection)
endif()
# Jumps land where the compiler meant them to, on processors that see to it.
check_cxx_compiler_flag(-fcf-protection=full SSOCLIENT_HAS_CF_PROTECTION)
if(SSOCLIENT_HAS_CF_PROTECTION)
    add_compile_options(-fcf-protection=full)
endif()

# For programs that users run. The tests are left to the compiler's habit, because LeakSanitizer takes
# what a library keeps for lost in a program that lies where it always does.
function(ssoclient_lie_anywhere program)
    target_link_options(${program} PRIVATE -pie)
endfunction()

# The sanitizers check more, and would see less of what these check first.
if(NOT SSOCLIENT_SANITIZE)
    add_compile_definitions(_GLIBCXX_ASSERTIONS)
    if(CMAKE_BUILD_TYPE STREQUAL "Release" OR CMAKE_BUILD_TYPE STREQUAL "RelWithDebInfo")
        add_compile_options(-U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=3)
    endif()
endif()
