# tally_page(TARGET ASSEMBLER WEB) compiles the page's template into a target: the files of the
# directory WEB and what they need of the library d3, all in one (MakePage.cmake). ASSEMBLER takes
# the template in.
set(TALLY_D3 /usr/share/nodejs CACHE PATH "Where the modules of d3 are: Debian's package node-d3")
set(TALLY_D3_LICENSES /usr/share/doc CACHE PATH
  "Where the licenses of these modules are: node-d3-MODULE/copyright in the form of Debian")

function(tally_page target assembler web)
  # Each stands behind those that it needs.
  set(modules array color format interpolate time time-format collection scale path shape hierarchy
    dispatch selection axis)
  list(TRANSFORM modules REPLACE "(.+)" "${TALLY_D3}/d3-\\1/dist/d3-\\1.min.js" OUTPUT_VARIABLE library)
  list(TRANSFORM modules REPLACE "(.+)" "${TALLY_D3_LICENSES}/node-d3-\\1/copyright"
    OUTPUT_VARIABLE licenses)
  foreach(file IN LISTS library licenses)
    if(NOT EXISTS "${file}")
      message(FATAL_ERROR "${file} is missing: the page is drawn by d3, of Debian's package node-d3; "
        "TALLY_D3 and TALLY_D3_LICENSES say where it is elsewhere")
    endif()
  endforeach()

  set(script "${PROJECT_SOURCE_DIR}/cmake/MakePage.cmake")
  set(template "${CMAKE_CURRENT_BINARY_DIR}/page.html")
  file(GLOB sources CONFIGURE_DEPENDS "${CMAKE_CURRENT_SOURCE_DIR}/${web}/*")
  add_custom_command(
    OUTPUT "${template}"
    COMMAND "${CMAKE_COMMAND}" "-DLIBRARY=${library}" "-DLICENSES=${licenses}"
      "-DWEB=${CMAKE_CURRENT_SOURCE_DIR}/${web}" "-DTEMPLATE=${template}" -P "${script}"
    DEPENDS ${sources} ${library} ${licenses} "${script}"
    VERBATIM)
  target_sources(${target} PRIVATE "${assembler}" "${template}")
  set_source_files_properties("${assembler}" PROPERTIES
    OBJECT_DEPENDS "${template}"
    COMPILE_DEFINITIONS "KSICACHE_PAGE_TEMPLATE=\"${template}\"")
endfunction()
