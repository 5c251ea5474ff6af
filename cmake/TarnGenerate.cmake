# tarn_generate(TARGET <library> IDL <file or dir>... [OUT <dir>]
#               [STANDINS_TARGET <library>] [TESTING_TARGET <library>])
#
# Runs tarn-gen over a catalogue during the build and makes a shared library of
# what it generates, linked to the runtime. The catalogue's headers are found
# through the library ("#include <root>/<namespace>.h"). Stand-in types go into
# STANDINS_TARGET when it is given, into the library otherwise; TESTING_TARGET,
# when given, is a library of the test doubles of the catalogue's managed types
# (their sources also come back as <library>_TESTING_SOURCES, the generated
# headers as <library>_HEADERS).
#
# Before calling it, TARN_GEN names the generator and TARN_RUNTIME the runtime
# target to link (the package sets both; so does the project's own build).
include_guard(GLOBAL)

# A library whose loaders register types must be loaded even by a program that
# names none of its symbols; the linker's --as-needed would drop it. Whoever
# links <target> gets it on the link line with --no-as-needed around it.
function(tarn_keep_loaded target)
  set(option "SHELL:-Wl,--push-state,--no-as-needed \"$<TARGET_FILE:${target}>\" -Wl,--pop-state")
  get_target_property(imported ${target} IMPORTED)
  if(NOT imported)
    # An exported copy gets its own from the package's config file.
    set(option "$<BUILD_INTERFACE:${option}>")
  endif()
  get_target_property(options ${target} INTERFACE_LINK_OPTIONS)
  if(NOT "${option}" IN_LIST options)  # find_package may run more than once in a directory
    set_property(TARGET ${target} APPEND PROPERTY INTERFACE_LINK_OPTIONS "${option}")
  endif()
endfunction()

function(tarn_generate)
  cmake_parse_arguments(arg "" "TARGET;OUT;STANDINS_TARGET;TESTING_TARGET" "IDL" ${ARGN})
  if(NOT arg_TARGET OR NOT arg_IDL)
    message(FATAL_ERROR "tarn_generate: TARGET and IDL are required")
  endif()
  if(NOT TARN_GEN OR NOT TARN_RUNTIME)
    message(FATAL_ERROR "tarn_generate: TARN_GEN and TARN_RUNTIME are not set (find_package(Tarn) sets them)")
  endif()
  if(NOT arg_OUT)
    set(arg_OUT ${CMAKE_CURRENT_BINARY_DIR}/${arg_TARGET}-generated)
  endif()
  set(idl_args "")
  set(globs "")
  foreach(path IN LISTS arg_IDL)
    cmake_path(ABSOLUTE_PATH path BASE_DIRECTORY ${CMAKE_CURRENT_SOURCE_DIR} NORMALIZE)
    list(APPEND idl_args --idl ${path})
    if(IS_DIRECTORY ${path})
      list(APPEND globs ${path}/*.idl)
    endif()
  endforeach()
  # Only to notice a catalogue file added or removed; the generator names what it read.
  if(globs)
    file(GLOB_RECURSE present CONFIGURE_DEPENDS ${globs})
  endif()
  set(list ${CMAKE_CURRENT_BINARY_DIR}/${arg_TARGET}-files.cmake)
  execute_process(COMMAND ${TARN_GEN} ${idl_args} --out ${arg_OUT} --list ${list}
                  RESULT_VARIABLE status ERROR_VARIABLE errors)
  if(NOT status EQUAL 0)
    message(FATAL_ERROR "tarn_generate(${arg_TARGET}):\n${errors}")
  endif()
  include(${list})
  set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${TARN_GEN_INPUTS})
  add_custom_command(
    OUTPUT ${TARN_GEN_OUTPUTS}
    COMMAND ${TARN_GEN} ${idl_args} --out ${arg_OUT}
    DEPENDS ${TARN_GEN} ${TARN_GEN_INPUTS}
    COMMENT "Generating ${arg_TARGET} from its catalogue"
    VERBATIM)
  add_custom_target(${arg_TARGET}-generated DEPENDS ${TARN_GEN_OUTPUTS})

  add_library(${arg_TARGET} SHARED ${TARN_GEN_TYPES_SOURCES})
  target_include_directories(${arg_TARGET} PUBLIC $<BUILD_INTERFACE:${arg_OUT}>)
  target_link_libraries(${arg_TARGET} PUBLIC ${TARN_RUNTIME})
  add_dependencies(${arg_TARGET} ${arg_TARGET}-generated)
  tarn_keep_loaded(${arg_TARGET})
  if(TARN_GEN_STANDINS_SOURCES)
    if(arg_STANDINS_TARGET)
      add_library(${arg_STANDINS_TARGET} SHARED ${TARN_GEN_STANDINS_SOURCES})
      target_include_directories(${arg_STANDINS_TARGET} PUBLIC $<BUILD_INTERFACE:${arg_OUT}>)
      target_link_libraries(${arg_STANDINS_TARGET} PUBLIC ${TARN_RUNTIME})
      add_dependencies(${arg_STANDINS_TARGET} ${arg_TARGET}-generated)
      target_link_libraries(${arg_TARGET} PUBLIC ${arg_STANDINS_TARGET})
    else()
      target_sources(${arg_TARGET} PRIVATE ${TARN_GEN_STANDINS_SOURCES})
    endif()
  endif()
  if(arg_TESTING_TARGET)
    add_library(${arg_TESTING_TARGET} SHARED ${TARN_GEN_TESTING_SOURCES})
    target_link_libraries(${arg_TESTING_TARGET} PUBLIC ${arg_TARGET} ${TARN_TESTING_RUNTIME})
    add_dependencies(${arg_TESTING_TARGET} ${arg_TARGET}-generated)
  endif()
  # For a caller that builds the doubles into a library of its own making.
  set(${arg_TARGET}_TESTING_SOURCES ${TARN_GEN_TESTING_SOURCES} PARENT_SCOPE)
  set(${arg_TARGET}_HEADERS ${TARN_GEN_HEADERS} PARENT_SCOPE)
  set(${arg_TARGET}_GENERATED_DIR ${arg_OUT} PARENT_SCOPE)
endfunction()
