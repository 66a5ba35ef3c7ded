# Installs the libraries, the public headers and the command line, with a CMake package and pkg-config
# files. All of it can be moved: nothing that is installed names the prefix. The components are those
# of the Debian packages.
include(CMakePackageConfigHelpers)

set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME libssoclient-dev)

set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/SsoClient)

function(ssoclient_install_library target name)
    set_target_properties(${target} PROPERTIES INSTALL_RPATH "$ORIGIN")
    install(TARGETS ${target} EXPORT SsoClientTargets
        LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
            COMPONENT ${name}${PROJECT_VERSION_MAJOR} NAMELINK_COMPONENT libssoclient-dev
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR})
endfunction()

set(pc_files quillon ssoclient ssoclient-runtime)
ssoclient_install_library(quillon libquillon)
ssoclient_install_library(ssoclient libssoclient)
ssoclient_install_library(ssoclient_runtime libssoclient-runtime)
if(SSOCLIENT_BUILD_GSS)
    list(APPEND pc_files ssoclient-gss)
    ssoclient_install_library(ssoclient_gss libssoclient-gss)
endif()
install(DIRECTORY lib/public/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} FILES_MATCHING PATTERN *.h)

file(RELATIVE_PATH bin_to_lib
    ${CMAKE_INSTALL_FULL_BINDIR} ${CMAKE_INSTALL_FULL_LIBDIR})
if(SSOCLIENT_BUILD_TOOLS)
    set_target_properties(ssoclient_tool PROPERTIES INSTALL_RPATH "$ORIGIN/${bin_to_lib}")
    install(TARGETS ssoclient_tool RUNTIME
        DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT ssoclient)
    # Where systemd looks below /usr and /usr/local alike.
    install(FILES packaging/systemd/ssoclient-keep@.service
        DESTINATION lib/systemd/system COMPONENT ssoclient)
endif()
# A service with well-known users is no part of a usual installation.
if(SSOCLIENT_BUILD_DEVSTS)
    install(TARGETS ssoclient-devsts RUNTIME
        DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT ssoclient-devsts EXCLUDE_FROM_ALL)
    install(FILES tools/devsts/ssoclient-devsts.1
        DESTINATION ${CMAKE_INSTALL_MANDIR}/man1 COMPONENT ssoclient-devsts EXCLUDE_FROM_ALL)
endif()

# Whoever links a static library links what it is made with, too.
if(library_type STREQUAL STATIC)
    set(static_dependencies "find_dependency(OpenSSL 3.0)
find_dependency(LibXml2)
find_dependency(CURL 7.87)
find_dependency(Threads)
")
    set(pc_requires "openssl >= 3.0, libxml-2.0, libcurl >= 7.87")
    set(pc_libs " -pthread -Wl,-z,nodelete")
    set(pc_cflags " -DQUILLON_STATIC")
    if(SSOCLIENT_BUILD_GSS)
        string(APPEND static_dependencies "find_dependency(PkgConfig)
pkg_check_modules(SSOCLIENT_KRB5 REQUIRED IMPORTED_TARGET mit-krb5-gssapi>=1.11 mit-krb5>=1.11)
")
        set(pc_gss_requires ", mit-krb5-gssapi >= 1.11, mit-krb5 >= 1.11")
    endif()
endif()

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
foreach(package ${pc_files})
    configure_file(cmake/${package}.pc.in ${package}.pc @ONLY)
    install(FILES ${CMAKE_CURRENT_BINARY_DIR}/${package}.pc
        DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
endforeach()
