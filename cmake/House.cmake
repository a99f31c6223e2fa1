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
