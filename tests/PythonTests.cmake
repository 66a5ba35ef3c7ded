find_package(Python3 REQUIRED COMPONENTS Interpreter)

# One test for every class of `script` that derives from `unittest.TestCase` or from a `...Test`
# class. The script stands in the calling folder. Further arguments are environment settings,
# NAME=VALUE.
function(ssoclient_add_python_tests script)
    set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${script})
    get_filename_component(module ${script} NAME_WE)
    file(STRINGS ${script} classes REGEX "^class [A-Za-z]+\\(([a-z]+\\.TestCase|[A-Za-z]*Test)\\)")
    if(NOT classes)
        message(FATAL_ERROR "${script} holds no test class")
    endif()
    foreach(class ${classes})
        string(REGEX REPLACE "^class ([A-Za-z]+).*" "\\1" class ${class})
        add_test(NAME ${module}.${class}
            COMMAND Python3::Interpreter -B ${CMAKE_CURRENT_SOURCE_DIR}/${script} --verbose ${class})
        # Each takes seconds where the others take milliseconds: started first, none is left alone at
        # the end.
        set_tests_properties(${module}.${class} PROPERTIES
            ENVIRONMENT "${ARGN}" TIMEOUT 300 COST 10)
    endforeach()
endfunction()
