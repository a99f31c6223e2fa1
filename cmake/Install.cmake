# What `cmake --install` leaves behind: a tree in which everything finds everything else from wherever the tree stands.
# Each file belongs to one component: library (what programs that use accounts need to run), development (what they need
# to build), host (what a device needs to migrate), tools, rehearse, python, documents, reference. The packages are made of them.

include(CMakePackageConfigHelpers)

set(package_dir "${CMAKE_INSTALL_LIBDIR}/cmake/AccountSettings")
set(headers_dir "${CMAKE_INSTALL_INCLUDEDIR}/account-settings")

# Everything that is needed to run, and nothing that only tests need.
add_custom_target(product)

foreach(library accountplatform accountsettings)
  if(TARGET ${library})
    add_dependencies(product ${library})
    target_compile_features(${library} INTERFACE cxx_std_20)
    install(TARGETS ${library} EXPORT AccountSettings
      LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}" COMPONENT library NAMELINK_COMPONENT development
      INCLUDES DESTINATION "${headers_dir}")
  endif()
endforeach()

# The interface for programs: its headers stand by themselves, and need no more than C++17.
if(TARGET accountsettings-client)
  set(client_headers_dir "${CMAKE_INSTALL_INCLUDEDIR}/account-settings-client")
  add_dependencies(product accountsettings-client)
  target_compile_features(accountsettings-client INTERFACE cxx_std_17)
  set_target_properties(accountsettings-client PROPERTIES EXPORT_NAME client)
  install(TARGETS accountsettings-client EXPORT AccountSettings
    LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}" COMPONENT library NAMELINK_COMPONENT development
    INCLUDES DESTINATION "${client_headers_dir}")
  install(DIRECTORY "${CMAKE_SOURCE_DIR}/client/include/" "${CMAKE_SOURCE_DIR}/bindings/include/"
    DESTINATION "${client_headers_dir}" COMPONENT development)
endif()

function(install_program program component)
  if(TARGET ${program})
    add_dependencies(product ${program})
    install(TARGETS ${program} RUNTIME DESTINATION "${CMAKE_INSTALL_BINDIR}" COMPONENT ${component})
  endif()
endfunction()

install_program(migration-host host)
install_program(accountctl tools)

if(TARGET accounts-migrator)
  add_dependencies(product accounts-migrator)
  install(TARGETS accounts-migrator LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}/account-settings" COMPONENT host)
endif()
foreach(rest account_modules pages rehearse resources)
  if(TARGET ${rest})
    add_dependencies(product ${rest})
  endif()
endforeach()

# The documents lie as they do in the source tree, so that what links to another one leads to it.
install(FILES ${CMAKE_SOURCE_DIR}/LICENSE ${CMAKE_SOURCE_DIR}/README.md ${CMAKE_SOURCE_DIR}/CONTRIBUTING.md
    ${CMAKE_SOURCE_DIR}/CHANGELOG.md ${CMAKE_SOURCE_DIR}/packages.txt
  DESTINATION "${CMAKE_INSTALL_DOCDIR}" COMPONENT documents)
install(DIRECTORY ${CMAKE_SOURCE_DIR}/docs ${CMAKE_SOURCE_DIR}/examples
  DESTINATION "${CMAKE_INSTALL_DOCDIR}" COMPONENT documents)

# What the store, the plug-in and the tests share is not for other programs.
set(internal_headers "/(file_paths|record_changes|change_tracker|equality_key)[.]h$")
foreach(folder accountsettings records platform)
  file(GLOB headers CONFIGURE_DEPENDS "${CMAKE_SOURCE_DIR}/${folder}/*.h")
  list(FILTER headers EXCLUDE REGEX "${internal_headers}")
  install(FILES ${headers} DESTINATION "${headers_dir}/${folder}" COMPONENT development)
endforeach()
# For programs that work on a device's file tree which stands elsewhere than at "/".
install(FILES "${CMAKE_SOURCE_DIR}/platform/linux/linux_platform.h"
  DESTINATION "${headers_dir}/platform/linux" COMPONENT development)

install(EXPORT AccountSettings NAMESPACE AccountSettings::
  DESTINATION "${package_dir}" FILE AccountSettingsTargets.cmake COMPONENT development)
configure_package_config_file(
  "${CMAKE_SOURCE_DIR}/cmake/AccountSettingsConfig.cmake.in" "${CMAKE_BINARY_DIR}/AccountSettingsConfig.cmake"
  INSTALL_DESTINATION "${package_dir}")
write_basic_package_version_file("${CMAKE_BINARY_DIR}/AccountSettingsConfigVersion.cmake" COMPATIBILITY SameMajorVersion)
install(FILES
  "${CMAKE_BINARY_DIR}/AccountSettingsConfig.cmake" "${CMAKE_BINARY_DIR}/AccountSettingsConfigVersion.cmake"
  DESTINATION "${package_dir}" COMPONENT development)

file(RELATIVE_PATH prefix_from_pkgconfig "/${CMAKE_INSTALL_LIBDIR}/pkgconfig" "/")
string(REGEX REPLACE "/$" "" prefix_from_pkgconfig "${prefix_from_pkgconfig}")
foreach(description account-settings account-settings-client)
  configure_file("${CMAKE_SOURCE_DIR}/cmake/${description}.pc.in" "${CMAKE_BINARY_DIR}/${description}.pc" @ONLY)
  install(FILES "${CMAKE_BINARY_DIR}/${description}.pc"
    DESTINATION "${CMAKE_INSTALL_LIBDIR}/pkgconfig" COMPONENT development)
endforeach()

# The build tree has the installed tree's shape, so its programs and libraries find each other by the same paths. What
# CMake puts into a build tree otherwise ends in empty places, for which the linker searches the current directory.
if(NOT CMAKE_SKIP_INSTALL_RPATH)
  foreach(target accountplatform accountsettings accountsettings-client migration-host accountctl accounts-migrator)
    if(TARGET ${target})
      set_target_properties(${target} PROPERTIES BUILD_WITH_INSTALL_RPATH ON)
    endif()
  endforeach()
endif()
