# CPack gives packages with libraries scripts that call ldconfig. The trigger does that, once for all
# packages that are installed together.
foreach(package ${CPACK_PACKAGE_FILES})
    set(folder ${CPACK_TEMPORARY_DIRECTORY}/unpacked)
    execute_process(COMMAND dpkg-deb --raw-extract ${package} ${folder} COMMAND_ERROR_IS_FATAL ANY)
    file(REMOVE ${folder}/DEBIAN/postinst ${folder}/DEBIAN/postrm)
    execute_process(COMMAND dpkg-deb --root-owner-group --build ${folder} ${package}
        OUTPUT_QUIET COMMAND_ERROR_IS_FATAL ANY)
    file(REMOVE_RECURSE ${folder})
endforeach()
