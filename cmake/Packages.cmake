# The Debian packages: `cmake --preset package`, build, then `cpack --preset package`. One package a component.

set(CPACK_PACKAGE_NAME account-settings)
set(CPACK_PACKAGE_VERSION "${PROJECT_VERSION}")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "")  # it would stand above every package's own
set(CPACK_PACKAGE_VENDOR "Vorlix")
set(CPACK_PACKAGE_CONTACT "Account Settings Maintainers <account-settings@vorlix.com>")
set(CPACK_PACKAGE_DIRECTORY "${CMAKE_BINARY_DIR}/packages")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_DEBIAN_DEBUGINFO_PACKAGE ON)  # strips, too, and puts the symbols into packages of their own
set(CPACK_VERBATIM_VARIABLES ON)
set(CPACK_COMPONENTS_ALL library development host tools rehearse python documents reference)
set(CPACK_PRE_BUILD_SCRIPTS "${CMAKE_SOURCE_DIR}/cmake/FinishPackages.cmake")
set(CPACK_POST_BUILD_SCRIPTS "${CMAKE_SOURCE_DIR}/cmake/RepackPackages.cmake")
set(CPACK_PACKAGING_SOURCES "${CMAKE_SOURCE_DIR}/packaging")
set(CPACK_PACKAGING_BUILD_TREE "${CMAKE_BINARY_DIR}")

set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_COMPRESSION_TYPE gzip)  # until each is packed once more
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS "${CMAKE_LIBRARY_OUTPUT_DIRECTORY}")
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_SOURCE account-settings)

set(library_package "libaccountsettings${PROJECT_VERSION_MAJOR}")
set(same_library "${library_package} (= ${PROJECT_VERSION})")

# debian_package(COMPONENT NAME SECTION DEPENDS DESCRIPTION): the description is a line and the text below it.
macro(debian_package component name section depends description)
  set(CPACK_DEBIAN_${component}_PACKAGE_NAME "${name}")
  set(CPACK_DEBIAN_${component}_PACKAGE_SECTION "${section}")
  set(CPACK_DEBIAN_${component}_PACKAGE_DEPENDS "${depends}")
  set(CPACK_DEBIAN_${component}_DESCRIPTION "${description}")
endmacro()

# The bus library is opened where there is a bus, so nothing that is linked tells of it.
debian_package(LIBRARY "${library_package}" libs "libsystemd0 (>= 241)" "accounts of a device - library
The account-settings library loads, edits, merges and saves the accounts of a
device. This package has the library, the modules that make accounts of each
type and announce changes, and the configuration of account types.")
debian_package(DEVELOPMENT libaccountsettings-dev libdevel "${same_library}" "accounts of a device - development files
The account-settings library loads, edits, merges and saves the accounts of a
device. This package has what is needed to build programs that use it.")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SUGGESTS libaccountsettings-doc)
debian_package(HOST migration-host admin
  "${same_library}, systemd | systemd-standalone-sysusers, systemd | systemd-standalone-tmpfiles"
  "accounts of a device - upgrade after a system update
The migration host is run once after a system update. It upgrades the account
settings that an earlier release of the system left behind, and converts the
mail and Exchange accounts of its first releases.")
set(CPACK_DEBIAN_HOST_PACKAGE_RECOMMENDS accountctl)
set(CPACK_DEBIAN_HOST_PACKAGE_SUGGESTS account-settings-doc)
debian_package(TOOLS accountctl utils "${same_library}" "accounts of a device - command-line client
accountctl lists, verifies and changes the accounts of a device.")
debian_package(REHEARSE migration-rehearse admin
  "migration-host (= ${PROJECT_VERSION}), python3 (>= 3.11), python3-libarchive-c"
  "accounts of a device - rehearsals over many device images
migration-rehearse tells what an upgrade of the account settings would do to
many device images and archives, none of which it changes.")
set(CPACK_DEBIAN_REHEARSE_PACKAGE_SUGGESTS python3-distributed)
set(CPACK_DEBIAN_REHEARSE_PACKAGE_ARCHITECTURE all)
debian_package(DOCUMENTS account-settings-doc doc "" "accounts of a device - documents and examples
What the upgrade of the account settings does step by step, how it is put into
a device and operated, and how programs and modules are written for it, with
example devices, an example program and an example module.")
set(CPACK_DEBIAN_DOCUMENTS_PACKAGE_ARCHITECTURE all)
debian_package(REFERENCE libaccountsettings-doc doc "" "accounts of a device - reference of the library
What the headers of libaccountsettings-dev declare for programs that list,
change and watch the accounts of a device, in C++ and in C.")
set(CPACK_DEBIAN_REFERENCE_PACKAGE_ARCHITECTURE all)
debian_package(PYTHON python3-account-settings python
  "${library_package} (>= ${PROJECT_VERSION}), python3 (>= 3.11)" "accounts of a device - Python module
The module account_settings lists, changes and watches the accounts of a
device.")
set(CPACK_DEBIAN_PYTHON_PACKAGE_ARCHITECTURE all)

# control_files(COMPONENT FILE...): packaging/COMPONENT.FILE as the package's control file FILE.
function(control_files component)
  string(TOUPPER ${component} upper)
  foreach(file IN LISTS ARGN)
    set(configured "${CMAKE_BINARY_DIR}/packaging/${component}/${file}")
    configure_file("${CMAKE_SOURCE_DIR}/packaging/${component}.${file}" "${configured}" @ONLY)
    list(APPEND files "${configured}")
  endforeach()
  set(CPACK_DEBIAN_${upper}_PACKAGE_CONTROL_EXTRA "${files}" PARENT_SCOPE)
endfunction()

control_files(library shlibs triggers)
control_files(host postinst postrm)

include(CPack)
