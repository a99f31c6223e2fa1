# Run by cpack when the packages are made. It gives a package with a shared library scripts that run ldconfig, and no
# way to go without; the package's trigger already sees to that.

foreach(package IN LISTS CPACK_PACKAGE_FILES)
  if(package MATCHES "/${CPACK_DEBIAN_LIBRARY_PACKAGE_NAME}_")
    set(tree "${CPACK_TEMPORARY_DIRECTORY}/trimmed")
    file(REMOVE_RECURSE "${tree}")
    execute_process(COMMAND dpkg-deb --raw-extract "${package}" "${tree}" COMMAND_ERROR_IS_FATAL ANY)
    file(REMOVE "${tree}/DEBIAN/postinst" "${tree}/DEBIAN/postrm")
    execute_process(COMMAND dpkg-deb --root-owner-group --build "${tree}" "${package}"
      COMMAND_ERROR_IS_FATAL ANY OUTPUT_QUIET)
  endif()
endforeach()
