# Debian packages, one for each component of the installation; the preset `package` builds what goes
# into them, and `./run packages` makes them.
set(major ${PROJECT_VERSION_MAJOR})
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME ssoclient)
set(CPACK_PACKAGE_VENDOR SsoClient)
set(SSOCLIENT_PACKAGE_CONTACT "SsoClient maintainers <maintainers@ssoclient.example>" CACHE STRING
    "Who answers for the Debian packages, as NAME <ADDRESS>")
set(CPACK_PACKAGE_CONTACT ${SSOCLIENT_PACKAGE_CONTACT})
set(CPACK_PACKAGE_DIRECTORY ${PROJECT_SOURCE_DIR}/build/packages)
set(CPACK_STRIP_FILES ON)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_GROUPING IGNORE)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_RELEASE 1)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS
    ${PROJECT_BINARY_DIR}/lib/quillon ${PROJECT_BINARY_DIR}/lib/ssoClient
    ${PROJECT_BINARY_DIR}/lib/ssoClientGss ${PROJECT_BINARY_DIR}/lib/ssoClientRuntime)
set(CPACK_PRE_BUILD_SCRIPTS ${PROJECT_SOURCE_DIR}/packaging/debian/compressManuals.cmake)
set(CPACK_POST_BUILD_SCRIPTS ${PROJECT_SOURCE_DIR}/packaging/debian/dropScripts.cmake)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS
    OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)
set(same_version "(= ${PROJECT_VERSION}-${CPACK_DEBIAN_PACKAGE_RELEASE})")

find_program(GZIP_PROGRAM gzip)
if(GZIP_PROGRAM)
    configure_file(${PROJECT_SOURCE_DIR}/packaging/debian/changelog
        ${PROJECT_BINARY_DIR}/changelog.Debian @ONLY)
    execute_process(COMMAND ${GZIP_PROGRAM} -9n
        INPUT_FILE ${PROJECT_BINARY_DIR}/changelog.Debian
        OUTPUT_FILE ${PROJECT_BINARY_DIR}/changelog.Debian.gz)
endif()

# ssoclient_library_package(NAME SONAME): what depends on the library depends on this package, and the
# linker's cache is renewed.
function(ssoclient_library_package name library)
    string(TOUPPER ${name} upper)
    set(folder ${PROJECT_BINARY_DIR}/${name})
    file(WRITE ${folder}/shlibs "${library} ${major} ${name} (>= ${PROJECT_VERSION})\n")
    file(WRITE ${folder}/triggers "activate-noawait ldconfig\n")
    set(CPACK_DEBIAN_${upper}_PACKAGE_CONTROL_EXTRA ${folder}/shlibs ${folder}/triggers PARENT_SCOPE)
endfunction()
ssoclient_library_package(libquillon${major} libquillon)
ssoclient_library_package(libssoclient${major} libssoclient)
ssoclient_library_package(libssoclient-gss${major} libssoclient_gss)
ssoclient_library_package(libssoclient-runtime${major} libssoclient_runtime)

# ssoclient_package(NAME SECTION DEPENDS DESCRIPTION): the first line of the description is the
# summary.
function(ssoclient_package name section depends description)
    string(TOUPPER ${name} upper)
    set(CPACK_DEBIAN_${upper}_PACKAGE_NAME ${name} PARENT_SCOPE)
    set(CPACK_DEBIAN_${upper}_PACKAGE_SECTION ${section} PARENT_SCOPE)
    set(CPACK_DEBIAN_${upper}_PACKAGE_DEPENDS "${depends}" PARENT_SCOPE)
    set(CPACK_COMPONENT_${upper}_DESCRIPTION "${description}" PARENT_SCOPE)
    set(CPACK_COMPONENTS_ALL ${CPACK_COMPONENTS_ALL} ${name} PARENT_SCOPE)
    # They belong to the packages alone, not to an installation under some prefix.
    if(CMAKE_INSTALL_PREFIX STREQUAL /usr)
        install(FILES packaging/debian/copyright ${PROJECT_BINARY_DIR}/changelog.Debian.gz
            DESTINATION share/doc/${name} COMPONENT ${name} EXCLUDE_FROM_ALL)
    endif()
endfunction()

set(CPACK_COMPONENTS_ALL)
# What the linker sees of libcurl is older than the options that are set.
ssoclient_package(libquillon${major} libs "libcurl4 (>= 7.87)"
    "XML signatures, certificates, HTTP and logging (foundation library)
The library below SsoClient: a lexical XML tree, canonicalization, XML
Signature in a narrow profile, certificates and keys, TLS, HTTP, a thread
pool and logging.")
ssoclient_package(libssoclient${major} libs "libquillon${major} ${same_version}"
    "SAML 2.0 tokens from a WS-Trust 1.3 token service (library)
Obtains, renews and validates SAML 2.0 tokens at a WS-Trust 1.3 security
token service over HTTPS, and verifies SAML 2.0 tokens from anywhere.")
ssoclient_package(libssoclient-gss${major} libs "libssoclient${major} ${same_version}"
    "SAML 2.0 tokens for Kerberos tickets (library)
Negotiates with MIT Kerberos for SsoClient: a token service then issues a
SAML 2.0 token to whoever has a ticket.")
ssoclient_package(libssoclient-runtime${major} libs "libssoclient${major} ${same_version}"
    "SAML 2.0 tokens in long-running processes (library)
Keeps good tokens for as long as a process lives: refreshes them in the
background, bridges outages of the token service, and caches tokens that
were exchanged for those of users.")
string(CONCAT all_libraries "libquillon${major} ${same_version}, libssoclient${major} ${same_version}, "
    "libssoclient-gss${major} ${same_version}, libssoclient-runtime${major} ${same_version}")
ssoclient_package(libssoclient-dev libdevel "${all_libraries}, libboost-dev (>= 1.74)"
    "SAML 2.0 tokens from a WS-Trust 1.3 token service (development files)
The headers of SsoClient and of Quillon below it, with a CMake package and
pkg-config files.")
ssoclient_package(ssoclient net "${all_libraries}"
    "SAML 2.0 tokens from a WS-Trust 1.3 token service (command line)
Obtains, renews and validates SAML 2.0 tokens at a WS-Trust 1.3 security
token service over HTTPS, keeps token files fresh, and verifies and
explains them.")
set(CPACK_DEBIAN_SSOCLIENT_PACKAGE_RECOMMENDS "krb5-user")
ssoclient_package(ssoclient-devsts net ""
    "WS-Trust 1.3 token service for development and tests
Issues SAML 2.0 tokens to users whose passwords stand in a file. It is for
tests alone and must not be trusted by anything that matters.")
include(CPack)
