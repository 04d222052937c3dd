# The files that `cmake --install` installs, in three components: program, runtime (the shared
# libraries) and development.
include(CMakePackageConfigHelpers)

set(quelta_cmake_dir "${CMAKE_INSTALL_LIBDIR}/cmake/quelta")
set(quelta_header_dir "${CMAKE_INSTALL_INCLUDEDIR}/quelta")
set(quelta_libraries util rete)
if(QUELTA_BUILD_LOADER)
  list(APPEND quelta_libraries loader)
endif()

# Libraries and headers
set(quelta_destinations
  LIBRARY COMPONENT runtime NAMELINK_COMPONENT development
  ARCHIVE COMPONENT development)
install(TARGETS quelta_util quelta_rete EXPORT queltaTargets ${quelta_destinations})
install(DIRECTORY src/util src/services DESTINATION "${quelta_header_dir}" COMPONENT development
  FILES_MATCHING PATTERN "*.h"
  PATTERN "internal" EXCLUDE)
install(FILES "${PROJECT_BINARY_DIR}/include/util/Version.h"
  DESTINATION "${quelta_header_dir}/util" COMPONENT development)
if(QUELTA_BUILD_LOADER)
  install(TARGETS quelta_loader quelta_xmlwrapp EXPORT queltaLoaderTargets ${quelta_destinations})
  if(QUELTA_XMLWRAPP_CHOICE STREQUAL "substitute")
    install(DIRECTORY src/xmlwrapp-substitute/xmlwrapp DESTINATION "${quelta_header_dir}"
      COMPONENT development FILES_MATCHING PATTERN "*.h")
  endif()
endif()

# find_package(quelta)
install(EXPORT queltaTargets NAMESPACE quelta:: DESTINATION "${quelta_cmake_dir}"
  COMPONENT development)
if(QUELTA_BUILD_LOADER)
  install(EXPORT queltaLoaderTargets NAMESPACE quelta:: DESTINATION "${quelta_cmake_dir}"
    COMPONENT development)
endif()
configure_package_config_file(cmake/queltaConfig.cmake.in
  "${PROJECT_BINARY_DIR}/queltaConfig.cmake" INSTALL_DESTINATION "${quelta_cmake_dir}")
write_basic_package_version_file("${PROJECT_BINARY_DIR}/queltaConfigVersion.cmake"
  COMPATIBILITY SameMajorVersion)
install(FILES
  "${PROJECT_BINARY_DIR}/queltaConfig.cmake"
  "${PROJECT_BINARY_DIR}/queltaConfigVersion.cmake"
  cmake/FindXmlwrapp.cmake
  DESTINATION "${quelta_cmake_dir}" COMPONENT development)

# pkg-config: quelta-util, quelta-rete, quelta-loader. The paths are relative to the file, so that
# the tree can be moved, unless the configured directories are absolute.
set(pc_dir "${CMAKE_INSTALL_LIBDIR}/pkgconfig")
if(IS_ABSOLUTE "${CMAKE_INSTALL_LIBDIR}")
  set(pc_prefix "${CMAKE_INSTALL_PREFIX}")
else()
  file(RELATIVE_PATH pc_prefix "${CMAKE_INSTALL_PREFIX}/${pc_dir}" "${CMAKE_INSTALL_PREFIX}")
  set(pc_prefix "\${pcfiledir}/${pc_prefix}")
endif()
cmake_path(APPEND pc_libdir "\${prefix}" "${CMAKE_INSTALL_LIBDIR}")
cmake_path(APPEND pc_includedir "\${prefix}" "${CMAKE_INSTALL_INCLUDEDIR}")

set(pc_description_util "Logging, threads, paths, descriptors, time, strings")
set(pc_libs_util "-L\${libdir} -lquelta_util -pthread")
set(pc_cflags_util "-I\${includedir}")
get_target_property(definitions quelta_util INTERFACE_COMPILE_DEFINITIONS)
if(definitions)
  list(TRANSFORM definitions PREPEND " -D" OUTPUT_VARIABLE definitions)
  string(APPEND pc_cflags_util ${definitions})
endif()

set(pc_description_rete "Rule network")
set(pc_requires_rete quelta-util)

set(pc_description_loader "Start-up of programs of the suite")
set(pc_requires_loader "quelta-util, popt")
set(pc_libs_loader "-L\${libdir} -lquelta_loader")
if(QUELTA_BUILD_LOADER)
  if(QUELTA_XMLWRAPP_CHOICE STREQUAL "system")
    string(APPEND pc_requires_loader ", xmlwrapp")
  else()
    string(APPEND pc_libs_loader " -lquelta_xmlwrapp")
    if(NOT BUILD_SHARED_LIBS)
      string(APPEND pc_requires_loader ", libxml-2.0")
    endif()
  endif()
endif()

foreach(pc_name ${quelta_libraries})
  foreach(field description requires cflags libs)
    set(pc_${field} "${pc_${field}_${pc_name}}")
  endforeach()
  configure_file(cmake/pkgconfig.pc.in "${PROJECT_BINARY_DIR}/quelta-${pc_name}.pc" @ONLY)
  install(FILES "${PROJECT_BINARY_DIR}/quelta-${pc_name}.pc" DESTINATION "${pc_dir}"
    COMPONENT development)
endforeach()

# The README, the files that it links to, and the API reference, if `script/check docs` has built
# it.
install(FILES README.md CHANGELOG.md CONTRIBUTING.md
  DESTINATION "${CMAKE_INSTALL_DOCDIR}" COMPONENT development)
install(DIRECTORY docs examples DESTINATION "${CMAKE_INSTALL_DOCDIR}" COMPONENT development
  FILES_MATCHING REGEX "\\.(md|svg|cpp|h|cfg|txt)$" PATTERN "CMakeLists.txt" EXCLUDE)
install(DIRECTORY build/docs/html/ DESTINATION "${CMAKE_INSTALL_DOCDIR}/api"
  COMPONENT development OPTIONAL)

if(NOT QUELTA_BUILD_PROGRAM)
  return()
endif()

# The programs, their manual pages and a sample installation. The pages contain the prefix. They
# are configured during installation, because `cmake --install --prefix` and CPack may change it.
install(TARGETS Rete RUNTIME COMPONENT program)
set(pages Rete.1 log-cmdline.cfg.5)
if(QUELTA_BUILD_EXAMPLES)
  install(TARGETS log_watch RUNTIME COMPONENT program)
  list(APPEND pages log_watch.1)
endif()
set(sample "${CMAKE_INSTALL_DATADIR}/quelta/sample")
set(QUELTA_SAMPLE "${CMAKE_INSTALL_PREFIX}/${sample}")
install(CODE "
  set(PROJECT_VERSION \"${PROJECT_VERSION}\")
  set(QUELTA_SAMPLE \"\${CMAKE_INSTALL_PREFIX}/${sample}\")" COMPONENT program)
foreach(page ${pages})
  set(source "${PROJECT_SOURCE_DIR}/man/${page}.in")
  set(installed "${PROJECT_BINARY_DIR}/man/installed/${page}")
  configure_file("${source}" "${PROJECT_BINARY_DIR}/man/${page}" @ONLY)
  install(CODE "configure_file(\"${source}\" \"${installed}\" @ONLY)" COMPONENT program)
  string(REGEX MATCH "[0-9]$" section "${page}")
  install(FILES "${installed}" DESTINATION "${CMAKE_INSTALL_MANDIR}/man${section}"
    COMPONENT program)
endforeach()
install(DIRECTORY sample/ DESTINATION "${sample}" COMPONENT program)
install(DIRECTORY DESTINATION "${sample}/etc/myinstall" COMPONENT program)
install(DIRECTORY DESTINATION "${sample}/var/log" COMPONENT program)
