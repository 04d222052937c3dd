# The target uninstall, and the Debian packages that `cpack --preset package` builds: quelta,
# libquelta1 and libquelta-dev.
add_custom_target(uninstall
  COMMAND xargs -a "${PROJECT_BINARY_DIR}/install_manifest.txt" -d "\\n" rm -fv
  COMMENT "Removing what the last cmake --install has installed"
  VERBATIM)

if(NOT BUILD_SHARED_LIBS)
  return()
endif()

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_CONTACT "Quelta developers <developers@quelta.example.org>")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_COMPONENTS_ALL program runtime development)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_PRE_BUILD_SCRIPTS "${PROJECT_SOURCE_DIR}/cmake/debian/finish.cmake")
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS
  "${PROJECT_BINARY_DIR}/src/util" "${PROJECT_BINARY_DIR}/src/xmlwrapp-substitute")

# Each description is a summary line and paragraphs.
set(quelta_long_description "
Named conditions and wildcard patterns feed boolean operators, which add
implications to a result set and remove them again. The utility layer has
logging, threads, paths, descriptors, time and strings.
")

set(CPACK_DEBIAN_PROGRAM_PACKAGE_NAME quelta)
set(CPACK_DEBIAN_PROGRAM_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PROGRAM_DESCRIPTION "rule network for terms and patterns (programs)\
${quelta_long_description}
This package has the programs, their manual pages and a sample.")
set(CPACK_DEBIAN_PROGRAM_PACKAGE_DEPENDS
  "libquelta${PROJECT_VERSION_MAJOR} (= ${PROJECT_VERSION})")

set(CPACK_DEBIAN_RUNTIME_PACKAGE_NAME libquelta${PROJECT_VERSION_MAJOR})
set(CPACK_DEBIAN_RUNTIME_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA "${PROJECT_SOURCE_DIR}/cmake/debian/triggers")
set(CPACK_DEBIAN_RUNTIME_DESCRIPTION "rule network for terms and patterns (libraries)\
${quelta_long_description}
This package has the shared libraries.")

# CMake and pkg-config look for popt on behalf of the loader.
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libquelta-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_DESCRIPTION "rule network for terms and patterns (development)\
${quelta_long_description}
This package has the headers, the files for CMake and pkg-config, and the
documents.")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS
  "libquelta${PROJECT_VERSION_MAJOR} (= ${PROJECT_VERSION}), libpopt-dev, pkgconf")
include(CPack)
