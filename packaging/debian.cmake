# Runs before each package is put together: adds the files that Debian requires in it and
# compresses what has to be.
function(compress file)
  execute_process(COMMAND gzip -9n "${file}" COMMAND_ERROR_IS_FATAL ANY)
endfunction()

foreach(component IN LISTS CPACK_COMPONENTS_ALL)
  string(TOUPPER "${component}" upper)
  set(root "${CPACK_TEMPORARY_DIRECTORY}/${component}/usr")
  if(NOT EXISTS "${root}")
    continue()
  endif()
  set(doc "${root}/share/doc/${CPACK_DEBIAN_${upper}_PACKAGE_NAME}")
  file(COPY "${CPACK_TALLY_DEBIAN_FILES}/copyright" "${CPACK_TALLY_DEBIAN_FILES}/changelog"
    DESTINATION "${doc}")
  compress("${doc}/changelog")
  file(GLOB pages "${root}/share/man/man*/*.[1-9]")
  foreach(page IN LISTS pages)
    compress("${page}")
  endforeach()
endforeach()
