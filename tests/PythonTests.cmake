find_package(Python3 REQUIRED COMPONENTS Interpreter)

# One test for every `unittest.TestCase` class of `script`, which stands in the calling folder.
# Further arguments are environment settings, NAME=VALUE.
function(sso_add_python_tests script)
    get_filename_component(module ${script} NAME_WE)
    file(STRINGS ${script} classes REGEX "^class [A-Za-z]+\\(unittest\\.TestCase\\)")
    foreach(class ${classes})
        string(REGEX REPLACE "^class ([A-Za-z]+).*" "\\1" class ${class})
        add_test(NAME ${module}.${class}
            COMMAND Python3::Interpreter -B ${CMAKE_CURRENT_SOURCE_DIR}/${script} --verbose ${class})
        set_tests_properties(${module}.${class} PROPERTIES ENVIRONMENT "${ARGN}" TIMEOUT 300)
    endforeach()
endfunction()
