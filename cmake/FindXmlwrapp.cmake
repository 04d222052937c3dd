# Finds an installed xmlwrapp: by its own package file first, then by pkg-config.
#
# Sets Xmlwrapp_FOUND and Xmlwrapp_SOURCE (where it was found). Defines the imported target
# Xmlwrapp::Xmlwrapp, which provides <xmlwrapp/node.h> and the libraries to link.
find_package(Xmlwrapp CONFIG QUIET)
if(Xmlwrapp_FOUND)
  set(Xmlwrapp_SOURCE "${Xmlwrapp_CONFIG}")
  # Package files differ in the name of their target.
  foreach(_xmlwrapp_target Xmlwrapp::xmlwrapp xmlwrapp::xmlwrapp Xmlwrapp xmlwrapp)
    if(TARGET ${_xmlwrapp_target} AND NOT TARGET Xmlwrapp::Xmlwrapp)
      add_library(Xmlwrapp::Xmlwrapp INTERFACE IMPORTED)
      target_link_libraries(Xmlwrapp::Xmlwrapp INTERFACE ${_xmlwrapp_target})
    endif()
  endforeach()
  if(NOT TARGET Xmlwrapp::Xmlwrapp AND Xmlwrapp_LIBRARIES)
    add_library(Xmlwrapp::Xmlwrapp INTERFACE IMPORTED)
    target_link_libraries(Xmlwrapp::Xmlwrapp INTERFACE ${Xmlwrapp_LIBRARIES})
    target_include_directories(Xmlwrapp::Xmlwrapp INTERFACE ${Xmlwrapp_INCLUDE_DIRS})
  endif()
else()
  find_package(PkgConfig QUIET)
  if(PkgConfig_FOUND)
    pkg_check_modules(XMLWRAPP QUIET IMPORTED_TARGET xmlwrapp)
  endif()
  if(XMLWRAPP_FOUND)
    set(Xmlwrapp_SOURCE "pkg-config, version ${XMLWRAPP_VERSION}")
    if(NOT TARGET Xmlwrapp::Xmlwrapp)
      add_library(Xmlwrapp::Xmlwrapp INTERFACE IMPORTED)
      target_link_libraries(Xmlwrapp::Xmlwrapp INTERFACE PkgConfig::XMLWRAPP)
    endif()
  endif()
endif()

if(NOT TARGET Xmlwrapp::Xmlwrapp)
  unset(Xmlwrapp_SOURCE)
endif()
include(FindPackageHandleStandardArgs)
find_package_handle_standard_args(Xmlwrapp REQUIRED_VARS Xmlwrapp_SOURCE
  REASON_FAILURE_MESSAGE "neither its package file nor pkg-config finds an installed xmlwrapp")
