# palisade_add_plugin(NAME SOURCES... ): a loadable plug-in module in a plug-in folder of its own.
#
# A plug-in folder holds the module and, beside it, Resources/LANGUAGE/LC_MESSAGES/Localizable.mo. The same layout is used in the
# build tree and after installation, so a module finds its texts wherever it is loaded from.

set(PALISADE_PLUGIN_BUILD_DIR ${PROJECT_BINARY_DIR}/plugins)
set(PALISADE_PLUGIN_INSTALL_DIR ${CMAKE_INSTALL_LIBDIR}/palisade/plugins)

function(palisade_add_plugin name)
  add_library(${name} MODULE ${ARGN})
  set_target_properties(${name} PROPERTIES
    PREFIX ""
    LIBRARY_OUTPUT_DIRECTORY ${PALISADE_PLUGIN_BUILD_DIR}/${name})
  target_link_libraries(${name} PRIVATE palisade-platform)
  # What the daemon loads stays loaded: registrations and callbacks of a module outlive its objects.
  target_link_options(${name} PRIVATE -Wl,-z,nodelete -Wl,--exclude-libs,ALL)
  if(NOT PALISADE_SANITIZERS)
    target_link_options(${name} PRIVATE -Wl,-z,defs)
  endif()
endfunction()
