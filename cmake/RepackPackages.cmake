# Run by cpack when the packages are made. Packs each once more, so that its bytes follow from the sources alone: no time,
# user, umask or order of this build is in it. The bill of materials is written beside them.

# Of the sources, unless whoever builds says otherwise.
set(time "$ENV{SOURCE_DATE_EPOCH}")
if(time STREQUAL "")
  execute_process(COMMAND dpkg-parsechangelog --file "${CPACK_PACKAGING_SOURCES}/changelog" --show-field Timestamp
    OUTPUT_VARIABLE time OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
endif()
set(ENV{SOURCE_DATE_EPOCH} "${time}")

set(settle [[
  chmod --recursive u=rwX,go=rX .
  find usr -type f -print0 | LC_ALL=C sort --zero-terminated | xargs --null md5sum > DEBIAN/md5sums
  chmod 0644 DEBIAN/md5sums
  files=$(find usr -type f -printf '%s\n' | awk '{ sum += int(($1 + 1023) / 1024) } END { print sum + 0 }')
  others=$(find usr ! -type f | wc -l)
  sed --in-place "s/^Installed-Size: .*/Installed-Size: $((files + others))/" DEBIAN/control
  find . -depth -exec touch --no-dereference --date "@$SOURCE_DATE_EPOCH" {} +
]])

foreach(package IN LISTS CPACK_PACKAGE_FILES)
  set(tree "${CPACK_TEMPORARY_DIRECTORY}/repacked")
  file(REMOVE_RECURSE "${tree}")
  execute_process(COMMAND dpkg-deb --raw-extract "${package}" "${tree}" COMMAND_ERROR_IS_FATAL ANY)
  # cpack gives a package with a shared library scripts that run ldconfig; the package's trigger already sees to that.
  if(package MATCHES "/${CPACK_DEBIAN_LIBRARY_PACKAGE_NAME}_")
    file(REMOVE "${tree}/DEBIAN/postinst" "${tree}/DEBIAN/postrm")
  endif()
  execute_process(COMMAND sh -e -c "${settle}" WORKING_DIRECTORY "${tree}" COMMAND_ERROR_IS_FATAL ANY)
  execute_process(COMMAND dpkg-deb --root-owner-group -Zxz --build "${tree}" "${package}"
    COMMAND_ERROR_IS_FATAL ANY OUTPUT_QUIET)
endforeach()

set(packages ${CPACK_PACKAGE_FILES})
list(FILTER packages INCLUDE REGEX "[.]deb$")
execute_process(COMMAND python3 -B "${CPACK_PACKAGING_SOURCES}/sbom.py" "${CPACK_PACKAGING_BUILD_TREE}"
    "${CPACK_PACKAGE_DIRECTORY}/${CPACK_PACKAGE_NAME}_${CPACK_PACKAGE_VERSION}.spdx.json" ${packages}
  COMMAND_ERROR_IS_FATAL ANY)
