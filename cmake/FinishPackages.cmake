# Run by cpack between installing and packing: what a Debian package has beside the files that every installation has.

function(compress file)
  execute_process(COMMAND gzip --best --no-name "${file}" COMMAND_ERROR_IS_FATAL ANY)
endfunction()

foreach(component IN LISTS CPACK_COMPONENTS_ALL)
  string(TOUPPER "${component}" upper)
  set(name "${CPACK_DEBIAN_${upper}_PACKAGE_NAME}")
  set(tree "${CPACK_TEMPORARY_INSTALL_DIRECTORY}/${component}${CPACK_PACKAGING_INSTALL_PREFIX}")

  set(documents "${tree}/share/doc/${name}")
  file(COPY "${CPACK_PACKAGING_SOURCES}/copyright" "${CPACK_PACKAGING_SOURCES}/changelog"
    DESTINATION "${documents}" FILE_PERMISSIONS OWNER_READ OWNER_WRITE GROUP_READ WORLD_READ)
  compress("${documents}/changelog")

  file(GLOB manuals "${tree}/share/man/*/*")
  foreach(manual IN LISTS manuals)
    compress("${manual}")
  endforeach()

  if(EXISTS "${CPACK_PACKAGING_SOURCES}/${component}.lintian-overrides")
    file(COPY_FILE "${CPACK_PACKAGING_SOURCES}/${component}.lintian-overrides" "${CPACK_TEMPORARY_DIRECTORY}/overrides")
    file(COPY "${CPACK_TEMPORARY_DIRECTORY}/overrides" DESTINATION "${tree}/share/lintian/overrides"
      FILE_PERMISSIONS OWNER_READ OWNER_WRITE GROUP_READ WORLD_READ)
    file(RENAME "${tree}/share/lintian/overrides/overrides" "${tree}/share/lintian/overrides/${name}")
  endif()
endforeach()
