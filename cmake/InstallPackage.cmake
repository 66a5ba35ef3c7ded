# Installs the libraries, the public headers and the tools, with a CMake package and pkg-config
# files. All of it can be moved: nothing that is installed names the prefix.
include(CMakePackageConfigHelpers)

set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/SsoClient)

set_target_properties(quillon ssoclient ssoclient_gss PROPERTIES INSTALL_RPATH "$ORIGIN")
install(TARGETS quillon ssoclient ssoclient_gss EXPORT SsoClientTargets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(DIRECTORY lib/public/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} FILES_MATCHING PATTERN *.h)

file(RELATIVE_PATH bin_to_lib
    ${CMAKE_INSTALL_FULL_BINDIR} ${CMAKE_INSTALL_FULL_LIBDIR})
foreach(tool ssoclient_tool ssoclient-devsts)
    if(TARGET ${tool})
        set_target_properties(${tool} PROPERTIES INSTALL_RPATH "$ORIGIN/${bin_to_lib}")
        install(TARGETS ${tool} RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
    endif()
endforeach()

install(EXPORT SsoClientTargets NAMESPACE SsoClient:: DESTINATION ${package_dir})
configure_package_config_file(cmake/SsoClientConfig.cmake.in SsoClientConfig.cmake
    INSTALL_DESTINATION ${package_dir})
write_basic_package_version_file(SsoClientConfigVersion.cmake COMPATIBILITY SameMinorVersion)
install(FILES
    ${CMAKE_CURRENT_BINARY_DIR}/SsoClientConfig.cmake
    ${CMAKE_CURRENT_BINARY_DIR}/SsoClientConfigVersion.cmake
    DESTINATION ${package_dir})

# pkg-config finds the prefix from where its file lies.
file(RELATIVE_PATH pc_to_prefix
    ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
foreach(package quillon ssoclient ssoclient-gss)
    configure_file(cmake/${package}.pc.in ${package}.pc @ONLY)
    install(FILES ${CMAKE_CURRENT_BINARY_DIR}/${package}.pc
        DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
endforeach()
