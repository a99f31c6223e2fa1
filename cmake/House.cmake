# The house: one library target per folder, dependencies pointing down only.
#
# house_headers(TARGET FOLDER) makes FOLDER's headers reachable, as "FOLDER/name.h", for those who link TARGET and
# for nobody else: they are linked one by one into a directory of the target's own, so a header of a folder that is
# not linked cannot be included at all.
function(house_headers target folder)
  file(GLOB headers CONFIGURE_DEPENDS RELATIVE "${CMAKE_SOURCE_DIR}/${folder}" "${CMAKE_SOURCE_DIR}/${folder}/*.h")
  set(shelf "${CMAKE_BINARY_DIR}/house/${target}")
  file(REMOVE_RECURSE "${shelf}")
  file(MAKE_DIRECTORY "${shelf}/${folder}")
  foreach(header IN LISTS headers)
    file(CREATE_LINK "${CMAKE_SOURCE_DIR}/${folder}/${header}" "${shelf}/${folder}/${header}" SYMBOLIC)
  endforeach()
  get_target_property(kind ${target} TYPE)
  if(kind STREQUAL "INTERFACE_LIBRARY")
    target_include_directories(${target} INTERFACE "$<BUILD_INTERFACE:${shelf}>")
  else()
    target_include_directories(${target} PUBLIC "$<BUILD_INTERFACE:${shelf}>")
  endif()
endfunction()

# house_binary(TARGET RUNPATH [MAP]): a program, library or module that is installed. It looks for its libraries in
# RUNPATH, relative to where it stands, built and installed alike; of a library, MAP (a file beside the CMakeLists.txt)
# says what it exports, since the language makes instances of the standard library's templates visible by itself.
function(house_binary target runpath)
  set_target_properties(${target} PROPERTIES INSTALL_RPATH "${runpath}")
  if(NOT CMAKE_SKIP_INSTALL_RPATH)
    set_target_properties(${target} PROPERTIES BUILD_WITH_INSTALL_RPATH ON)
  endif()
  if(ARGC GREATER 2)
    set(map "${CMAKE_CURRENT_SOURCE_DIR}/${ARGV2}")
    # What a library calls of itself is its own, so the loader need not look for it.
    target_link_options(${target} PRIVATE "-Wl,--version-script=${map}" -Wl,-Bsymbolic-functions)
    set_target_properties(${target} PROPERTIES LINK_DEPENDS "${map}")
  endif()
endfunction()
