# Run by CPack: adds the changelog and the copyright file to each package, and compresses changelogs
# and manual pages.
foreach(component program runtime development)
  string(TOUPPER ${component} upper)
  set(root "${CPACK_TEMPORARY_INSTALL_DIRECTORY}/${component}/usr/share")
  set(documents "${root}/doc/${CPACK_DEBIAN_${upper}_PACKAGE_NAME}")
  configure_file("${CMAKE_CURRENT_LIST_DIR}/changelog.in" "${documents}/changelog" @ONLY)
  file(COPY "${CMAKE_CURRENT_LIST_DIR}/copyright" DESTINATION "${documents}")
  file(GLOB_RECURSE pages "${root}/man/*")
  execute_process(COMMAND gzip -9n "${documents}/changelog" ${pages} COMMAND_ERROR_IS_FATAL ANY)
endforeach()
