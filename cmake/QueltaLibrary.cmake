# quelta_library(NAME [INTERFACE] source...): adds the library quelta_NAME, called quelta::NAME by
# users. A shared library exports the symbols that NAME.map lists.
function(quelta_library name)
  set(target quelta_${name})
  add_library(${target} ${ARGN})
  add_library(quelta::${name} ALIAS ${target})
  set_target_properties(${target} PROPERTIES EXPORT_NAME ${name})
  get_target_property(type ${target} TYPE)
  if(type STREQUAL "INTERFACE_LIBRARY")
    return()
  endif()
  set_target_properties(${target} PROPERTIES
    VERSION ${PROJECT_VERSION} SOVERSION ${PROJECT_VERSION_MAJOR})
  if(type STREQUAL "SHARED_LIBRARY")
    # -Bsymbolic: the library calls its own functions even if a program defines others of the same
    # names, such as those of a class Mutex. The symbols of NAME.dynamic are objects that programs
    # may refer to directly; library and program must agree on one copy of each.
    set(map "${CMAKE_CURRENT_SOURCE_DIR}/${name}.map")
    target_link_options(${target} PRIVATE -Wl,--version-script=${map} -Wl,-Bsymbolic)
    set_property(TARGET ${target} APPEND PROPERTY LINK_DEPENDS ${map})
    set(dynamic "${CMAKE_CURRENT_SOURCE_DIR}/${name}.dynamic")
    if(EXISTS ${dynamic})
      target_link_options(${target} PRIVATE -Wl,--dynamic-list=${dynamic})
    endif()
  endif()
endfunction()
