# Where everything goes when it is installed, and in which of two components: `runtime` is what a user's session needs,
# `development` is for whoever writes a plug-in, a client or a server outside this tree.
#
# `cmake --install --prefix` may choose another prefix than the one that was configured. So programs find their files from where
# they stand themselves, and files that have to name a program are written while they are installed.

set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME runtime)
# A plug-in folder that others can write is refused, whatever umask the installation ran under.
set(CMAKE_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS
  OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)

set(PALISADE_HEADERS_INSTALL_DIR ${CMAKE_INSTALL_INCLUDEDIR}/palisade)
set(PALISADE_PACKAGE_INSTALL_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/Palisade)

# palisade_install_service(FILE DESTINATION): installs FILE.in with @libexecdir@ replaced by where the daemons went.
function(palisade_install_service file destination)
  install(CODE "
    set(libexecdir \"${CMAKE_INSTALL_LIBEXECDIR}\")
    cmake_path(ABSOLUTE_PATH libexecdir BASE_DIRECTORY \"\${CMAKE_INSTALL_PREFIX}\" NORMALIZE)
    configure_file(\"${CMAKE_CURRENT_SOURCE_DIR}/${file}.in\" \"${CMAKE_CURRENT_BINARY_DIR}/${file}\" @ONLY)
    file(INSTALL DESTINATION \"\${CMAKE_INSTALL_PREFIX}/${destination}\" TYPE FILE FILES \"${CMAKE_CURRENT_BINARY_DIR}/${file}\")
  ")
endfunction()

# palisade_install_settings(FILE): installs everybody's settings where they are looked for, unless somebody has written some.
function(palisade_install_settings file)
  install(CODE "
    set(folder \"${CMAKE_INSTALL_SYSCONFDIR}\")
    if(CMAKE_INSTALL_PREFIX STREQUAL \"/usr\")
      set(folder \"/etc\")
    endif()
    cmake_path(ABSOLUTE_PATH folder BASE_DIRECTORY \"\${CMAKE_INSTALL_PREFIX}\" NORMALIZE)
    if(EXISTS \"\$ENV{DESTDIR}\${folder}/xdg/palisade/${file}\")
      message(STATUS \"Kept: \$ENV{DESTDIR}\${folder}/xdg/palisade/${file}\")
    else()
      file(INSTALL DESTINATION \"\${folder}/xdg/palisade\" TYPE FILE FILES \"${CMAKE_CURRENT_SOURCE_DIR}/${file}\")
    endif()
  ")
endfunction()

# palisade_install_library(NAME AS): a library with the headers of the current folder, to be found as Palisade::AS. Everybody
# includes the headers by their path from the top, such as "Platform/Value.h".
function(palisade_install_library name as)
  add_library(Palisade::${as} ALIAS ${name})
  set_target_properties(${name} PROPERTIES EXPORT_NAME ${as})
  target_compile_features(${name} PUBLIC cxx_std_20)
  target_include_directories(${name} INTERFACE $<INSTALL_INTERFACE:${PALISADE_HEADERS_INSTALL_DIR}>)
  install(TARGETS ${name} EXPORT PalisadeTargets ARCHIVE COMPONENT development)
  cmake_path(GET CMAKE_CURRENT_SOURCE_DIR FILENAME folder)
  install(DIRECTORY ${CMAKE_CURRENT_SOURCE_DIR}/ DESTINATION ${PALISADE_HEADERS_INSTALL_DIR}/${folder}
    COMPONENT development FILES_MATCHING PATTERN "*.h")
endfunction()

# palisade_install_package(): what find_package(Palisade) finds.
function(palisade_install_package)
  include(CMakePackageConfigHelpers)
  configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/PalisadeConfig.cmake.in ${PROJECT_BINARY_DIR}/PalisadeConfig.cmake
    INSTALL_DESTINATION ${PALISADE_PACKAGE_INSTALL_DIR} NO_SET_AND_CHECK_MACRO)
  write_basic_package_version_file(${PROJECT_BINARY_DIR}/PalisadeConfigVersion.cmake COMPATIBILITY SameMinorVersion)
  install(EXPORT PalisadeTargets NAMESPACE Palisade:: DESTINATION ${PALISADE_PACKAGE_INSTALL_DIR} COMPONENT development)
  install(FILES ${PROJECT_BINARY_DIR}/PalisadeConfig.cmake ${PROJECT_BINARY_DIR}/PalisadeConfigVersion.cmake
      ${PROJECT_SOURCE_DIR}/cmake/PluginFolder.cmake
    DESTINATION ${PALISADE_PACKAGE_INSTALL_DIR} COMPONENT development)
endfunction()
