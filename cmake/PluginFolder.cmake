# palisade_add_plugin(NAME SOURCES... [EXPORTS SYMBOLS...]): a loadable plug-in module in a plug-in folder of its own. The module
# shows its entry point, what EXPORTS names, and nothing else, not even what it took from the standard library.
#
# A plug-in folder holds the module and, beside it, Resources/LANGUAGE/LC_MESSAGES/Localizable.mo. The same layout is used in the
# build tree and after installation, so a module finds its texts wherever it is loaded from.
#
# Installed as it stands, for plug-ins outside this tree.

set(PALISADE_PLUGIN_BUILD_DIR ${PROJECT_BINARY_DIR}/plugins)
set(PALISADE_PLUGIN_INSTALL_DIR ${CMAKE_INSTALL_LIBDIR}/palisade/plugins)

function(palisade_add_plugin name)
  cmake_parse_arguments(PLUGIN "" "" "EXPORTS" ${ARGN})
  add_library(${name} MODULE ${PLUGIN_UNPARSED_ARGUMENTS})
  set_target_properties(${name} PROPERTIES
    PREFIX ""
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON
    LIBRARY_OUTPUT_DIRECTORY ${PALISADE_PLUGIN_BUILD_DIR}/${name})
  target_link_libraries(${name} PRIVATE Palisade::platform)

  string(JOIN "; " exports accountAccessPluginModule ${PLUGIN_EXPORTS})
  file(CONFIGURE OUTPUT ${CMAKE_CURRENT_BINARY_DIR}/${name}.map
    CONTENT "{ global: ${exports}; local: *; };\n")
  # What the daemon loads stays loaded: registrations and callbacks of a module outlive its objects.
  target_link_options(${name} PRIVATE -Wl,-z,nodelete -Wl,--version-script=${CMAKE_CURRENT_BINARY_DIR}/${name}.map)
  if(NOT PALISADE_SANITIZERS)
    target_link_options(${name} PRIVATE -Wl,-z,defs)
  endif()
  # The loader refuses a module that others could change, whatever umask the build ran under.
  add_custom_command(TARGET ${name} POST_BUILD COMMAND chmod go-w $<TARGET_FILE:${name}> $<TARGET_FILE_DIR:${name}> VERBATIM)
endfunction()

function(palisade_add_strings name folder)
  find_program(PALISADE_MSGFMT msgfmt REQUIRED)
  file(GLOB sources CONFIGURE_DEPENDS ${folder}/*.po)
  foreach(source IN LISTS sources)
    cmake_path(GET source STEM LAST_ONLY language)
    set(messages Resources/${language}/LC_MESSAGES)
    set(catalogue ${PALISADE_PLUGIN_BUILD_DIR}/${name}/${messages}/Localizable.mo)
    add_custom_command(OUTPUT ${catalogue}
      COMMAND ${CMAKE_COMMAND} -E make_directory ${PALISADE_PLUGIN_BUILD_DIR}/${name}/${messages}
      COMMAND ${PALISADE_MSGFMT} --check --output-file=${catalogue} ${source}
      DEPENDS ${source}
      COMMENT "Compiling ${name}'s texts in ${language}"
      VERBATIM)
    install(FILES ${catalogue} DESTINATION ${PALISADE_PLUGIN_INSTALL_DIR}/${name}/${messages})
    list(APPEND catalogues ${catalogue})
  endforeach()
  add_custom_target(${name}-strings ALL DEPENDS ${catalogues})
  if(TARGET ${name})
    add_dependencies(${name} ${name}-strings)
  endif()
endfunction()
