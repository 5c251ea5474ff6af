# tarn_generate(<prefix> IDL <catalogue dir> OUT <output dir>) runs the generator
# over a catalogue during the build. The generator itself says which files a run
# writes (tarn-gen --list, at configure time); they come back as
# <prefix>_TYPES_SOURCES, <prefix>_STANDINS_SOURCES, <prefix>_TESTING_SOURCES, and
# the target <prefix>-generated makes them all.
include_guard(GLOBAL)

# The generator is a host tool, built before any catalogue is listed, without the
# preset's compiler and sanitizer flags; build trees side by side in one build/
# folder (the presets') share one.
get_filename_component(tarn_build_parent ${CMAKE_BINARY_DIR} DIRECTORY)
if(tarn_build_parent STREQUAL "${PROJECT_SOURCE_DIR}/build")
  set(TARN_GEN_HOST_DIR ${tarn_build_parent}/tarn-gen-host)
else()
  set(TARN_GEN_HOST_DIR ${CMAKE_BINARY_DIR}/tarn-gen-host)
endif()
set(TARN_GEN ${TARN_GEN_HOST_DIR}/tarn-gen CACHE INTERNAL "the host generator")
file(GLOB tarn_gen_sources CONFIGURE_DEPENDS ${CMAKE_CURRENT_LIST_DIR}/*.cpp ${CMAKE_CURRENT_LIST_DIR}/*.h)
set_property(DIRECTORY ${PROJECT_SOURCE_DIR} APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS
             ${tarn_gen_sources} ${CMAKE_CURRENT_LIST_DIR}/CMakeLists.txt
             ${PROJECT_SOURCE_DIR}/orbit/include/orbit/Records.h)
set(tarn_gen_flags "-Wall -Wextra")
if(TARN_WERROR)
  string(APPEND tarn_gen_flags " -Werror")
endif()
execute_process(
  COMMAND ${CMAKE_COMMAND} -S ${CMAKE_CURRENT_LIST_DIR} -B ${TARN_GEN_HOST_DIR} -G ${CMAKE_GENERATOR}
          -DCMAKE_CXX_COMPILER_LAUNCHER=${CMAKE_CXX_COMPILER_LAUNCHER} -DCMAKE_CXX_FLAGS=${tarn_gen_flags}
  RESULT_VARIABLE status OUTPUT_VARIABLE log ERROR_VARIABLE log)
if(status EQUAL 0)
  execute_process(COMMAND ${CMAKE_COMMAND} --build ${TARN_GEN_HOST_DIR}
                  RESULT_VARIABLE status OUTPUT_VARIABLE log ERROR_VARIABLE log)
endif()
if(NOT status EQUAL 0)
  message(FATAL_ERROR "building the generator failed:\n${log}")
endif()

function(tarn_generate prefix)
  cmake_parse_arguments(arg "" "IDL;OUT" "" ${ARGN})
  # Only to notice a catalogue file added or removed; the generator names what it read.
  file(GLOB_RECURSE present CONFIGURE_DEPENDS ${arg_IDL}/*)
  set(list ${CMAKE_CURRENT_BINARY_DIR}/${prefix}-files.cmake)
  execute_process(COMMAND ${TARN_GEN} --idl ${arg_IDL} --out ${arg_OUT} --list ${list}
                  RESULT_VARIABLE status ERROR_VARIABLE errors)
  if(NOT status EQUAL 0)
    message(FATAL_ERROR "${errors}")
  endif()
  include(${list})
  set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${TARN_GEN_INPUTS})
  add_custom_command(
    OUTPUT ${TARN_GEN_OUTPUTS}
    COMMAND ${TARN_GEN} --idl ${arg_IDL} --out ${arg_OUT}
    DEPENDS ${TARN_GEN} ${TARN_GEN_INPUTS}
    COMMENT "Generating ${prefix} from ${arg_IDL}"
    VERBATIM)
  add_custom_target(${prefix}-generated DEPENDS ${TARN_GEN_OUTPUTS})
  foreach(kind TYPES STANDINS TESTING)
    set(${prefix}_${kind}_SOURCES ${TARN_GEN_${kind}_SOURCES} PARENT_SCOPE)
  endforeach()
endfunction()
