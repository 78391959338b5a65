# Generated resources of the module: the type library, compiled by widl from the IDL.
# Debian's wine64-tools installs the compiler as widl-stable and under /usr/lib/wine; only
# the full wine package adds the plain name.
find_program(MARLIX_WIDL NAMES widl widl-stable PATHS /usr/lib/wine NO_CMAKE_FIND_ROOT_PATH REQUIRED)
find_path(MARLIX_WIDL_INCLUDE unknwn.idl PATHS /usr/include/wine/wine/windows /usr/include/wine/windows
          NO_CMAKE_FIND_ROOT_PATH REQUIRED)

set(MARLIX_TYPELIB ${MARLIX_GENERATED_DIR}/MarlixDLShellExt.tlb)
add_custom_command(
  OUTPUT ${MARLIX_TYPELIB}
  COMMAND ${MARLIX_WIDL} --win64 -I${MARLIX_WIDL_INCLUDE} -I${MARLIX_GENERATED_DIR} -t -o ${MARLIX_TYPELIB}
          ${CMAKE_SOURCE_DIR}/server/MarlixDLShellExt.idl
  DEPENDS ${CMAKE_SOURCE_DIR}/server/MarlixDLShellExt.idl ${MARLIX_GENERATED_DIR}/marlix_version.h
  COMMENT "Type library MarlixDLShellExt.tlb"
  VERBATIM)
# The level's icon group names the images of the namespace icon instead of holding a copy.
set(MARLIX_LEVEL_ICON_GROUP ${MARLIX_GENERATED_DIR}/level_icon_group.rc)
add_custom_command(
  OUTPUT ${MARLIX_LEVEL_ICON_GROUP}
  COMMAND ${CMAKE_COMMAND} -DICO=${CMAKE_SOURCE_DIR}/server/icons/level.ico -DNAME=IDI_LEVEL
          -DOUT=${MARLIX_LEVEL_ICON_GROUP} -P ${CMAKE_SOURCE_DIR}/server/icon_group.cmake
  DEPENDS ${CMAKE_SOURCE_DIR}/server/icons/level.ico ${CMAKE_SOURCE_DIR}/server/icon_group.cmake
  VERBATIM)
add_custom_target(marlix_typelib DEPENDS ${MARLIX_TYPELIB} ${MARLIX_LEVEL_ICON_GROUP})
# Every binary with module.rc links the core, so the type library exists before any of them.
add_dependencies(marlix_base marlix_typelib)

# Files that module.rc pulls in without #include, so that a change recompiles it.
file(GLOB MARLIX_MODULE_RC_DEPENDS CONFIGURE_DEPENDS ${CMAKE_SOURCE_DIR}/server/*.rgs ${CMAKE_SOURCE_DIR}/base/resource_ids.h
     ${CMAKE_SOURCE_DIR}/server/*.rc ${CMAKE_SOURCE_DIR}/server/clip/*.avi)
list(APPEND MARLIX_MODULE_RC_DEPENDS ${MARLIX_TYPELIB})

# Source properties are per directory: call this where a target compiles module.rc.
function(marlix_module_rc_depends)
  set_source_files_properties(${MARLIX_MODULE_RC} PROPERTIES OBJECT_DEPENDS "${MARLIX_MODULE_RC_DEPENDS}")
endfunction()

# Generated files that module.rc includes.
list(APPEND MARLIX_MODULE_RC_DEPENDS ${MARLIX_LEVEL_ICON_GROUP} ${MARLIX_GENERATED_DIR}/marlix_version.h)
