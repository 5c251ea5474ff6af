# The project's own use of tarn_generate: builds the generator as a host tool and
# points TARN_GEN at it (the top level sets TARN_RUNTIME).
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
          -DCMAKE_CXX_COMPILER_LAUNCHER=${CMAKE_CXX_COMPILER_LAUNCHER} -DCMAKE_CXX_FLAGS=${tarn_gen_flags} -DTARN_VERSION=${PROJECT_VERSION}
  RESULT_VARIABLE status OUTPUT_VARIABLE log ERROR_VARIABLE log)
if(status EQUAL 0)
  execute_process(COMMAND ${CMAKE_COMMAND} --build ${TARN_GEN_HOST_DIR}
                  RESULT_VARIABLE status OUTPUT_VARIABLE log ERROR_VARIABLE log)
endif()
if(NOT status EQUAL 0)
  message(FATAL_ERROR "building the generator failed:\n${log}")
endif()

include(${PROJECT_SOURCE_DIR}/cmake/TarnGenerate.cmake)
