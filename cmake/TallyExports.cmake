# tally_exports(TARGET FILE) lets a library export what FILE spells, a version script in which
# @nodes@ stands for the objects of ksi_nodes.h. Nothing else is visible, that of the C++ library
# inside included: it would take the place of the program's.
function(tally_exports target file)
  set(header "${PROJECT_SOURCE_DIR}/knvlibs/include/knvlibs/ksi_nodes.h")
  set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS "${header}")
  file(READ "${header}" text)
  string(REGEX MATCHALL "\n  NODE\\([A-Za-z0-9_]+" rows "${text}")
  list(TRANSFORM rows REPLACE ".*\\((.*)" "KSI_NODE_\\1")
  list(JOIN rows ";\n    " nodes)

  set(script "${CMAKE_CURRENT_BINARY_DIR}/${target}.map")
  configure_file("${file}" "${script}" @ONLY)
  target_link_options(${target} PRIVATE "LINKER:--version-script=${script}")
  set_target_properties(${target} PROPERTIES LINK_DEPENDS "${script}")
endfunction()
