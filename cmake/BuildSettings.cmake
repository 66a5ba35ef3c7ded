# Compiler settings shared by every target of the project.
set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

if(NOT CMAKE_BUILD_TYPE AND PROJECT_IS_TOP_LEVEL)
    set(CMAKE_BUILD_TYPE Release)
endif()

add_compile_options(-Wall -Wextra -Wpedantic -Wshadow
    -Woverloaded-virtual -Wcast-align -Wformat=2 -Wundef -Wconversion -Wno-sign-conversion)

if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
    # GCC 12 sees overlapping copies in any string concatenation (its bug 105651).
    add_compile_options(-Wno-restrict)
endif()

if(SSOCLIENT_WERROR)
    add_compile_options(-Werror)
endif()

set(SSOCLIENT_SANITIZE "" CACHE STRING "Sanitizers to build with, for example address,undefined")
if(SSOCLIENT_SANITIZE)
    add_compile_options(-fsanitize=${SSOCLIENT_SANITIZE} -fno-sanitize-recover=all
        -fno-omit-frame-pointer)
    add_link_options(-fsanitize=${SSOCLIENT_SANITIZE})
endif()

include(Hardening)

# Shared unless BUILD_SHARED_LIBS says otherwise; without any word CMake itself would make them static.
set(library_type SHARED)
if(DEFINED BUILD_SHARED_LIBS AND NOT BUILD_SHARED_LIBS)
    set(library_type STATIC)
endif()

# Keeps a library in the process once it is there: its threads may still run its code after a host
# has unloaded the module that brought it. A static library hands that on to what it is linked into.
function(ssoclient_stay_loaded library)
    if(library_type STREQUAL SHARED)
        target_link_options(${library} PRIVATE -Wl,-z,nodelete)
    else()
        target_link_options(${library} INTERFACE -Wl,-z,nodelete)
    endif()
endfunction()
