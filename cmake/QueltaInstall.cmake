# The files that `cmake --install` installs, and the Debian package that `cpack` builds from them.
include(CMakePackageConfigHelpers)

set(quelta_cmake_dir "${CMAKE_INSTALL_LIBDIR}/cmake/quelta")
set(quelta_pc_dir "${CMAKE_INSTALL_LIBDIR}/pkgconfig")

install(TARGETS Rete RUNTIME)
install(TARGETS quelta_util quelta_loader quelta_rete quelta_xmlwrapp EXPORT queltaTargets ARCHIVE)
install(DIRECTORY src/util src/services DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}/quelta"
  FILES_MATCHING PATTERN "*.h"
  PATTERN "internal" EXCLUDE)
if(QUELTA_XMLWRAPP_CHOICE STREQUAL "substitute")
  install(DIRECTORY src/xmlwrapp-substitute/xmlwrapp
    DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}/quelta" FILES_MATCHING PATTERN "*.h")
endif()

# find_package(quelta)
install(EXPORT queltaTargets NAMESPACE quelta:: DESTINATION "${quelta_cmake_dir}")
configure_package_config_file(cmake/queltaConfig.cmake.in
  "${PROJECT_BINARY_DIR}/queltaConfig.cmake" INSTALL_DESTINATION "${quelta_cmake_dir}")
write_basic_package_version_file("${PROJECT_BINARY_DIR}/queltaConfigVersion.cmake"
  COMPATIBILITY SameMajorVersion)
install(FILES
  "${PROJECT_BINARY_DIR}/queltaConfig.cmake"
  "${PROJECT_BINARY_DIR}/queltaConfigVersion.cmake"
  cmake/FindXmlwrapp.cmake
  DESTINATION "${quelta_cmake_dir}")

# pkg-config quelta; the paths are relative to the file, so that the tree can be moved.
file(RELATIVE_PATH quelta_pc_to_prefix
  "${CMAKE_INSTALL_PREFIX}/${quelta_pc_dir}" "${CMAKE_INSTALL_PREFIX}")
if(QUELTA_XMLWRAPP_CHOICE STREQUAL "substitute")
  set(quelta_pc_requires "popt, libxml-2.0")
  set(quelta_pc_xmlwrapp "-lquelta_xmlwrapp")
else()
  set(quelta_pc_requires "popt, xmlwrapp")
  set(quelta_pc_xmlwrapp "")
endif()
configure_file(cmake/quelta.pc.in "${PROJECT_BINARY_DIR}/quelta.pc" @ONLY)
install(FILES "${PROJECT_BINARY_DIR}/quelta.pc" DESTINATION "${quelta_pc_dir}")

# The manual pages and a sample installation. The pages contain the prefix. They are configured
# during installation, because `cmake --install --prefix` and CPack may change it.
set(sample "${CMAKE_INSTALL_DATADIR}/quelta/sample")
set(QUELTA_SAMPLE "${CMAKE_INSTALL_PREFIX}/${sample}")
install(CODE "
  set(PROJECT_VERSION \"${PROJECT_VERSION}\")
  set(QUELTA_SAMPLE \"\${CMAKE_INSTALL_PREFIX}/${sample}\")")
foreach(page Rete.1 log-cmdline.cfg.5)
  set(source "${PROJECT_SOURCE_DIR}/man/${page}.in")
  set(installed "${PROJECT_BINARY_DIR}/man/installed/${page}")
  configure_file("${source}" "${PROJECT_BINARY_DIR}/man/${page}" @ONLY)
  install(CODE "configure_file(\"${source}\" \"${installed}\" @ONLY)")
  string(REGEX MATCH "[0-9]$" section "${page}")
  install(FILES "${installed}" DESTINATION "${CMAKE_INSTALL_MANDIR}/man${section}")
endforeach()
install(DIRECTORY sample/ DESTINATION "${sample}")
install(DIRECTORY DESTINATION "${sample}/etc/myinstall")
install(DIRECTORY DESTINATION "${sample}/var/log")
# The README and the files that it links to.
install(FILES README.md CHANGELOG.md CONTRIBUTING.md DESTINATION "${CMAKE_INSTALL_DOCDIR}")
install(DIRECTORY docs examples DESTINATION "${CMAKE_INSTALL_DOCDIR}"
  FILES_MATCHING REGEX "\\.(md|svg|cpp|cfg|txt)$" PATTERN "CMakeLists.txt" EXCLUDE)

# The API reference, if `script/check docs` has built it.
install(DIRECTORY build/docs/html/ DESTINATION "${CMAKE_INSTALL_DOCDIR}/api" OPTIONAL)

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_CONTACT "The Quelta developers <quelta@localhost>")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# Needed to build against the libraries, not to run the program.
set(CPACK_DEBIAN_PACKAGE_SUGGESTS "libpopt-dev, libxml2-dev, pkg-config")
include(CPack)
