# For ./test mutants: compiles the copies of sources in PALISADE_MUTATED_SOURCES, into which faults are seeded, in place of the
# sources themselves. Headers are found there first.

add_library(palisade-mutants STATIC ${PROJECT_SOURCE_DIR}/Tools/Mutants/Mutant.cpp)
target_include_directories(palisade-mutants PRIVATE ${PROJECT_SOURCE_DIR})
set_target_properties(palisade-mutants PROPERTIES POSITION_INDEPENDENT_CODE ON)

include_directories(BEFORE ${PALISADE_MUTATED_SOURCES})
link_libraries($<BUILD_INTERFACE:palisade-mutants>)
# The copies hold what nobody would write.
add_compile_options(-w)

# palisade_compile_mutated_sources(): called when all targets are there.
function(palisade_compile_mutated_sources)
  file(GLOB_RECURSE copies RELATIVE ${PALISADE_MUTATED_SOURCES} ${PALISADE_MUTATED_SOURCES}/*.cpp)
  foreach(copy ${copies})
    get_filename_component(folder ${copy} DIRECTORY)
    get_filename_component(name ${copy} NAME)
    get_property(targets DIRECTORY ${PROJECT_SOURCE_DIR}/${folder} PROPERTY BUILDSYSTEM_TARGETS)
    foreach(target ${targets})
      get_target_property(sources ${target} SOURCES)
      list(FIND sources ${name} position)
      if(NOT position EQUAL -1)
        list(TRANSFORM sources REPLACE "^${name}$" ${PALISADE_MUTATED_SOURCES}/${copy})
        set_target_properties(${target} PROPERTIES SOURCES "${sources}")
      endif()
    endforeach()
  endforeach()
endfunction()
