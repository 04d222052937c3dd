# Settles which xmlwrapp the project is built with, and says so. QUELTA_XMLWRAPP is
#   auto     an installed one where there is one, otherwise the stand-in (the default)
#   system   an installed one, or configuring fails
#   bundled  the stand-in in src/xmlwrapp-bundled/
# Either way the target is quelta::xmlwrapp and the include <xmlwrapp/node.h>. The choice is left in
# QUELTA_XMLWRAPP_CHOICE: system or bundled.
set(QUELTA_XMLWRAPP auto CACHE STRING "Which xmlwrapp to build with: auto, system or bundled")
set_property(CACHE QUELTA_XMLWRAPP PROPERTY STRINGS auto system bundled)

if(QUELTA_XMLWRAPP STREQUAL "bundled")
  set(Xmlwrapp_FOUND FALSE)
elseif(QUELTA_XMLWRAPP STREQUAL "system")
  find_package(Xmlwrapp REQUIRED MODULE)
elseif(QUELTA_XMLWRAPP STREQUAL "auto")
  find_package(Xmlwrapp QUIET MODULE)
else()
  message(FATAL_ERROR
    "QUELTA_XMLWRAPP is \"${QUELTA_XMLWRAPP}\"; it must be auto, system or bundled")
endif()

if(Xmlwrapp_FOUND)
  set(QUELTA_XMLWRAPP_CHOICE system)
  message(STATUS "xmlwrapp: system (${Xmlwrapp_SOURCE})")
else()
  set(QUELTA_XMLWRAPP_CHOICE bundled)
  message(STATUS "xmlwrapp: bundled (src/xmlwrapp-bundled)")
endif()
