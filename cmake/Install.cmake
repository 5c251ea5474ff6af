# What `cmake --install` puts under the prefix: the libraries with their headers
# below one include root, tarn-gen and tarn-catalog, the CMake package Tarn
# (targets Tarn::kernite, Tarn::orbit, Tarn::standins, Tarn::types, Tarn::testing,
# Tarn::wire, Tarn::http and tarn_generate) and a pkg-config file per library.
include(CMakePackageConfigHelpers)

set(tarn_libraries kernite orbit)
foreach(library orbit-wire orbit-http)
  if(TARGET ${library})
    list(APPEND tarn_libraries ${library})
  endif()
endforeach()
if(NOT TARN_RUNTIME_ONLY)
  list(APPEND tarn_libraries tarn-standins tarn-types tarn-types-testing)
endif()
foreach(library IN LISTS tarn_libraries)
  # kernite, orbit, wire, http, standins, types, testing
  string(REGEX REPLACE "^(orbit-|tarn-types-|tarn-)" "" name ${library})
  set_target_properties(${library} PROPERTIES EXPORT_NAME ${name} VERSION ${PROJECT_VERSION}
                        SOVERSION ${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR})
  target_include_directories(${library} INTERFACE $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}>)
endforeach()

install(TARGETS ${tarn_libraries} EXPORT TarnTargets
        LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
        INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
foreach(dir kernite/include orbit/include wire/include testing/include)
  if(EXISTS ${PROJECT_SOURCE_DIR}/${dir})
    install(DIRECTORY ${PROJECT_SOURCE_DIR}/${dir}/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} FILES_MATCHING PATTERN "*.h")
  endif()
endforeach()
install(FILES ${TARN_RUNTIME_INCLUDE}/orbit/Version.h DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/orbit)
foreach(header IN LISTS TARN_GEN_HEADERS)
  file(RELATIVE_PATH relative ${TARN_GEN_DIR} ${header})
  get_filename_component(dir ${relative} DIRECTORY)
  install(FILES ${header} DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/${dir})
endforeach()

if(NOT TARN_RUNTIME_ONLY)
  install(PROGRAMS ${TARN_GEN} DESTINATION ${CMAKE_INSTALL_BINDIR})
  install(TARGETS tarn-catalog RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
endif()

set(config_dir ${CMAKE_INSTALL_LIBDIR}/cmake/Tarn)
install(EXPORT TarnTargets NAMESPACE Tarn:: DESTINATION ${config_dir})
configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/TarnConfig.cmake.in ${PROJECT_BINARY_DIR}/TarnConfig.cmake
                              INSTALL_DESTINATION ${config_dir} PATH_VARS CMAKE_INSTALL_BINDIR)
# Generated code fits one runtime version exactly (see orbit/Version.h).
write_basic_package_version_file(${PROJECT_BINARY_DIR}/TarnConfigVersion.cmake COMPATIBILITY ExactVersion)
install(FILES ${PROJECT_BINARY_DIR}/TarnConfig.cmake ${PROJECT_BINARY_DIR}/TarnConfigVersion.cmake
              ${CMAKE_CURRENT_LIST_DIR}/TarnGenerate.cmake
        DESTINATION ${config_dir})

# pkg-config: tarn-kernite, tarn-orbit, tarn-wire, tarn-http, tarn-types, tarn-types-testing.
# They find the prefix from their own place, so an installed tree can move.
file(RELATIVE_PATH pc_up /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
function(tarn_pkg_config file name description requires libs private)
  set(pc_name ${name})
  set(pc_description ${description})
  set(pc_requires ${requires})
  set(pc_libs ${libs})
  set(pc_private ${private})
  configure_file(${CMAKE_CURRENT_FUNCTION_LIST_DIR}/tarn.pc.in ${PROJECT_BINARY_DIR}/pkgconfig/${file}.pc @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/pkgconfig/${file}.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
endfunction()
tarn_pkg_config(tarn-kernite "Kernite" "Core object library of libtarn-types" "" "-lkernite" "-pthread -ldl")
tarn_pkg_config(tarn-orbit "Orbit" "Object-model runtime of libtarn-types" "tarn-kernite" "-lorbit" "")
if(TARGET orbit-wire)
  tarn_pkg_config(tarn-wire "Orbit wire" "SOAP codec of the Orbit runtime" "tarn-orbit" "-lorbit-wire" "")
endif()
if(TARGET orbit-http)
  tarn_pkg_config(tarn-http "Orbit HTTP" "SOAP over HTTP and TLS for the Orbit runtime" "tarn-wire" "-lorbit-http" "")
endif()
if(NOT TARN_RUNTIME_ONLY)
  # The library registers its types when it loads, so it stays linked even where a
  # program names none of its symbols.
  tarn_pkg_config(tarn-types "libtarn-types" "Bindings of the tarn internal API" "tarn-orbit"
                  "-Wl,--push-state,--no-as-needed -ltarn-types -Wl,--pop-state -ltarn-standins" "")
  tarn_pkg_config(tarn-types-testing "libtarn-types-testing" "Test doubles of the tarn managed types" "tarn-types"
                  "-ltarn-types-testing" "")
endif()
