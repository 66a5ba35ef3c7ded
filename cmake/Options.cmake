# What to build. A project that takes this one in by add_subdirectory or FetchContent gets the
# libraries and nothing else, unless it asks; docs/building.md has the table.
option(SSOCLIENT_BUILD_GSS "Build libssoclient_gss, the handler for Kerberos" ON)
option(SSOCLIENT_BUILD_BENCHMARKS "Build the benchmarks" ${PROJECT_IS_TOP_LEVEL})
option(SSOCLIENT_FUZZ "Link the programs of tests/fuzz with libFuzzer" OFF)
option(SSOCLIENT_INSTALL "Have install rules" ${PROJECT_IS_TOP_LEVEL})
option(SSOCLIENT_UNITY_BUILD "Compile tools and tests several sources at a time" OFF)
option(SSOCLIENT_WERROR "Treat compiler warnings as errors" ${PROJECT_IS_TOP_LEVEL})

# The tests try the handler for Kerberos, and the command line has a command that needs it.
set(with_gss OFF)
if(PROJECT_IS_TOP_LEVEL AND SSOCLIENT_BUILD_GSS)
    set(with_gss ON)
endif()
option(SSOCLIENT_BUILD_TOOLS "Build the command line" ${with_gss})
option(SSOCLIENT_BUILD_TESTS "Build the tests, the examples and what they need" ${with_gss})
option(SSOCLIENT_BUILD_DEVSTS "Build the development STS" ${SSOCLIENT_BUILD_TOOLS})
if(NOT SSOCLIENT_BUILD_GSS)
    foreach(part TOOLS TESTS)
        if(SSOCLIENT_BUILD_${part})
            message(FATAL_ERROR "SSOCLIENT_BUILD_${part} needs SSOCLIENT_BUILD_GSS")
        endif()
    endforeach()
endif()

# The libraries are compiled a source at a time, even in a project that has another habit: equal names
# in anonymous namespaces of different sources are no mistake.
set(CMAKE_UNITY_BUILD OFF)
