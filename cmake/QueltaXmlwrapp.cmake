# Chooses the xmlwrapp to build with, and reports it. QUELTA_XMLWRAPP is
#   auto        an installed xmlwrapp if there is one, otherwise the substitute (the default)
#   system      an installed xmlwrapp; configuring fails without it
#   substitute  src/xmlwrapp-substitute/
# Either way the target is quelta::xmlwrapp and the include <xmlwrapp/node.h>.
# Sets QUELTA_XMLWRAPP_CHOICE to system or substitute.
set(QUELTA_XMLWRAPP auto CACHE STRING "Which xmlwrapp to build with: auto, system or substitute")
set_property(CACHE QUELTA_XMLWRAPP PROPERTY STRINGS auto system substitute)

if(QUELTA_XMLWRAPP STREQUAL "substitute")
  set(Xmlwrapp_FOUND FALSE)
elseif(QUELTA_XMLWRAPP STREQUAL "system")
  find_package(Xmlwrapp REQUIRED MODULE)
elseif(QUELTA_XMLWRAPP STREQUAL "auto")
  find_package(Xmlwrapp QUIET MODULE)
else()
  message(FATAL_ERROR
    "QUELTA_XMLWRAPP is \"${QUELTA_XMLWRAPP}\"; it must be auto, system or substitute")
endif()

if(Xmlwrapp_FOUND)
  set(QUELTA_XMLWRAPP_CHOICE system)
  message(STATUS "xmlwrapp: system (${Xmlwrapp_SOURCE})")
else()
  set(QUELTA_XMLWRAPP_CHOICE substitute)
  message(STATUS "xmlwrapp: substitute (src/xmlwrapp-substitute)")
endif()
